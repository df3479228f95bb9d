#pragma once

#include <chrono>
#include <cstddef>
#include <map>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/Time.h"

namespace MetrikSdk::report {

/// Events that were lost shortly after one another: a run. A person who reads that losses began wants to know
/// in the end how many there were, when, and whose. Pure: the times are the caller's. Threads: one at a time.
class LossRun {
public:
    /// Modules that a run counts one by one, and names. A hostile program has thousands.
    static constexpr std::size_t MAX_MODULES = 20;

    /// Losses this far apart are two runs.
    explicit LossRun(std::chrono::milliseconds ends) : m_ends(ends) {}

    /// `count` events of `module` were lost. Whether a run begins with them.
    bool Add(const std::string& module, std::size_t count, SteadyTime now, WallTime wall);

    /// The totals of the run that is over, once; nothing while it goes on, and when there was none.
    std::optional<std::string> TakeEnded(SteadyTime now);

    /// The same for the run under way, because nothing will be told any more.
    std::optional<std::string> Take();

private:
    struct Run {
        WallTime from{};
        WallTime to{};
        SteadyTime last{};
        std::size_t events = 0;
        std::map<std::string, std::size_t> modules;
    };

    static std::string Text(const Run& run);

    std::chrono::milliseconds m_ends;
    std::optional<Run> m_run;
};

} // namespace MetrikSdk::report
