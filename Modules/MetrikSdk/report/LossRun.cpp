#include "Modules/MetrikSdk/report/LossRun.h"

#include <ctime>

namespace MetrikSdk::report {
namespace {

/// Such as 2026-11-20T10:15:30Z.
std::string Utc(WallTime time) {
    const auto seconds =
        std::chrono::floor<std::chrono::seconds>(Computable(time)).time_since_epoch().count();
    const auto since1970 = static_cast<std::time_t>(seconds);
    std::tm parts{};
    ::gmtime_r(&since1970, &parts);
    char text[32] = "";
    std::strftime(text, sizeof(text), "%Y-%m-%dT%H:%M:%SZ", &parts);
    return text;
}

} // namespace

bool LossRun::Add(const std::string& module, std::size_t count, SteadyTime now, WallTime wall) {
    const bool begins = !m_run;
    if (begins)
        m_run = Run{wall, wall, now, 0, {}};
    m_run->to = wall;
    m_run->last = now;
    m_run->events += count;
    if (m_run->modules.contains(module) || m_run->modules.size() < MAX_MODULES)
        m_run->modules[module] += count;
    return begins;
}

std::optional<std::string> LossRun::TakeEnded(SteadyTime now) {
    return m_run && now - m_run->last > m_ends ? Take() : std::nullopt;
}

std::optional<std::string> LossRun::Take() {
    if (!m_run)
        return std::nullopt;
    auto text = Text(*m_run);
    m_run.reset();
    return text;
}

std::string LossRun::Text(const Run& run) {
    auto text = std::to_string(run.events) + (run.events == 1 ? " event from " : " events from ") +
                Utc(run.from) + " to " + Utc(run.to) + ":";
    auto others = run.events;
    for (const auto& [module, count] : run.modules) {
        text += " " + module + " " + std::to_string(count) + ",";
        others -= count;
    }
    if (others > 0)
        return text + " other modules " + std::to_string(others);
    text.pop_back();
    return text;
}

} // namespace MetrikSdk::report
