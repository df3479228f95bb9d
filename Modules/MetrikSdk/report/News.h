#pragma once

#include <string>

namespace MetrikSdk::report {

/// What went wrong. The causes are coarse on purpose: the log gets each of them at most once in an interval.
enum class Cause {
    Configuration, ///< A variable of the environment makes no sense.
    Directory,     ///< There is no directory in which the outbox can be.
    File,          ///< The outbox file cannot be used for now.
    Damage,        ///< The outbox file is damaged and was set aside.
    Vanished,      ///< The outbox file was deleted or replaced.
    Event,         ///< The event itself cannot be stored, in any state of the file.
    Drop,          ///< Events were dropped to keep within a cap.
    Upload,        ///< The collector cannot be reached or asks to wait.
    Refusal,       ///< Events that the collector will never take.
    Warning,       ///< A collector's message about events that it took.
    Init,          ///< A module could not be initialised for an unexpected reason.
    Count          ///< How many causes there are.
};

/// The first text that the failure callback gets for this cause.
const char* NameOf(Cause cause);

/// A failure, the end of failures, or the totals of a run of losses, to be reported to the callbacks.
struct News {
    enum class Kind {
        Failure, ///< Reported at most once in an interval.
        End,     ///< Reported when the failure was.
        Totals   ///< Always reported. Each outbox has its own, and at most one in ten minutes.
    };
    Cause cause;
    std::string text;
    Kind kind = Kind::Failure;
};

} // namespace MetrikSdk::report
