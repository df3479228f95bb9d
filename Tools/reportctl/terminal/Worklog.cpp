#include "Tools/reportctl/terminal/Worklog.h"

#include <cstdio>
#include <exception>

#include <fmt/format.h>

namespace reportctl::terminal {

void Worklog::AlreadyDone(const std::string& thing) {
    Say("already there: " + thing);
}

bool Worklog::Run(const Verb& verb, const std::string& thing, const std::function<void()>& action,
                  const std::string& advice) {
    try {
        if (!m_isDryRun)
            action();
    } catch (const AlreadyThere&) {
        AlreadyDone(thing);
        return true;
    } catch (const std::exception& error) {
        Fail(fmt::format("Not {}: {}: {}. {}", verb.done, thing, error.what(), advice));
        return false;
    }
    m_hasChanged = true;
    Say(fmt::format("{} {}", m_isDryRun ? verb.planned : verb.done, thing));
    return true;
}

void Worklog::Fail(const std::string& text) {
    m_hasFailed = true;
    fmt::print(stderr, "error: {}\n", text);
}

void Worklog::Warn(const std::string& text) const {
    fmt::print(stderr, "warning: {}\n", text);
}

bool Worklog::Summarise() const {
    if (m_hasFailed)
        Say("not everything is set up: see the errors");
    else if (!m_hasChanged)
        Say("nothing to do: everything was set up before");
    else if (m_isDryRun)
        Say("dry run: nothing was changed");
    return !m_hasFailed;
}

void Worklog::Say(const std::string& line) const {
    if (!m_isQuiet)
        fmt::print("{}\n", line);
}

} // namespace reportctl::terminal
