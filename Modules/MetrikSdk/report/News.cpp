#include "Modules/MetrikSdk/report/News.h"

namespace MetrikSdk::report {

const char* NameOf(Cause cause) {
    switch (cause) {
    case Cause::Configuration:
        return "configuration";
    case Cause::Directory:
        return "directory";
    case Cause::File:
        return "outbox file";
    case Cause::Damage:
        return "outbox damaged";
    case Cause::Vanished:
        return "outbox vanished";
    case Cause::Event:
        return "event";
    case Cause::Drop:
        return "events dropped";
    case Cause::Upload:
        return "upload";
    case Cause::Refusal:
        return "events refused";
    case Cause::Warning:
        return "collector warning";
    case Cause::Init:
        return "init";
    case Cause::Count:
        break;
    }
    return "unknown";
}

} // namespace MetrikSdk::report
