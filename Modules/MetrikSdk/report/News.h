#pragma once

#include <string>

namespace MetrikSdk::report {

/// What went wrong. Coarse on purpose: in the log, each of these is repeated once in an interval at most.
enum class Cause {
    Configuration, ///< A variable of the environment that makes no sense.
    Directory,     ///< No directory to keep the outbox in.
    File,          ///< The outbox file cannot be used for now.
    Damage,        ///< The outbox file was set aside.
    Vanished,      ///< The outbox file was deleted or replaced.
    Event,         ///< An event that cannot be stored in any state of the file.
    Drop,          ///< Events given up for a cap.
    Upload,        ///< The collector cannot be reached or asks to wait.
    Refusal,       ///< Events that the collector will never take.
    Warning,       ///< What a collector has to say about events that it took.
    Init,          ///< A module could not be initialised for an unexpected reason.
    Count          ///< How many causes there are.
};

/// The first text of the failure callback.
const char* NameOf(Cause cause);

/// A failure, or the end of failures, on its way to the callbacks.
struct News {
    enum class Kind { Failure, End };
    Cause cause;
    std::string text;
    Kind kind = Kind::Failure;
};

} // namespace MetrikSdk::report
