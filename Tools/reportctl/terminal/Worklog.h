#pragma once

#include <functional>
#include <string>

namespace reportctl::terminal {

/// An action's name in the output: the word for the action done, and the words that a dry run prints.
struct Verb {
    const char* done;
    const char* planned;
};

inline constexpr Verb MAKE{"made", "would make"};
inline constexpr Verb CHANGE{"changed", "would change"};
inline constexpr Verb SET{"set", "would set"};
inline constexpr Verb MIGRATE{"migrated", "would migrate"};
inline constexpr Verb RENAME{"renamed", "would rename"};

/// An action throws this when another program has already done the same, for example a second set-up that
/// runs at the same time.
struct AlreadyThere {};

/// Runs actions and prints one line for each: results on standard output, failures and warnings on standard
/// error. A dry run only prints what it would do. A quiet worklog prints failures and warnings only.
///
/// One thread.
class Worklog {
public:
    explicit Worklog(bool isDryRun, bool isQuiet = false) : m_isDryRun(isDryRun), m_isQuiet(isQuiet) {}

    /// Prints that `thing` is there already.
    void AlreadyDone(const std::string& thing);

    /// Runs `action`, which acts on `thing`, unless this is a dry run. When it throws AlreadyThere, the
    /// result is that of AlreadyDone. Any other std::exception from it is printed as a failure, followed by
    /// `advice`. Returns false after a failure.
    bool Run(const Verb& verb, const std::string& thing, const std::function<void()>& action,
             const std::string& advice = {});

    /// Prints a failure. `text` says what could not be done, and what the person can do about it.
    void Fail(const std::string& text);

    /// Prints a warning: the state is accepted, but will not have the effect that the person wants.
    void Warn(const std::string& text) const;

    bool IsDryRun() const { return m_isDryRun; }

    /// Prints the last line, which sums up. Returns true when nothing failed.
    bool Summarise() const;

private:
    void Say(const std::string& line) const;

    bool m_isDryRun;
    bool m_isQuiet;
    bool m_hasChanged = false;
    bool m_hasFailed = false;
};

} // namespace reportctl::terminal
