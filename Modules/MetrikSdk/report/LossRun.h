#pragma once

#include <chrono>
#include <cstddef>
#include <map>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/Time.h"

namespace MetrikSdk::report {

/// A run of losses: events that were lost shortly after one another. A person who reads that losses began
/// wants to know in the end how many events were lost, when, and from which modules. Pure: the caller passes
/// the times. Threads: one at a time.
class LossRun {
public:
    /// How many modules a run counts one by one, and names. A hostile program may have thousands.
    static constexpr std::size_t MAX_MODULES = 20;

    /// Losses that are further apart than `ends` are two runs.
    explicit LossRun(std::chrono::milliseconds ends) : m_ends(ends) {}

    /// `count` events of `module` were lost. Returns whether a run begins with them.
    bool Add(const std::string& module, std::size_t count, SteadyTime now, WallTime wall);

    /// The totals of a run that is over; each run is returned once. Nothing while the run goes on, or when
    /// there was none.
    std::optional<std::string> TakeEnded(SteadyTime now);

    /// The totals of the run, also while it goes on. For a caller that cannot report anything later.
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
