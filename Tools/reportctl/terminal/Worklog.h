#pragma once

#include <functional>
#include <string>

namespace reportctl::terminal {

/// What is done to a thing: the word for having done it, and for what a dry run would do.
struct Verb {
    const char* done;
    const char* planned;
};

inline constexpr Verb MAKE{"made", "would make"};
inline constexpr Verb CHANGE{"changed", "would change"};
inline constexpr Verb SET{"set", "would set"};
inline constexpr Verb MIGRATE{"migrated", "would migrate"};
inline constexpr Verb RENAME{"renamed", "would rename"};

/// What an action throws when another program has done the same meanwhile, such as a set-up that was started
/// with this one.
struct AlreadyThere {};

/// Does things and tells the person, one line each: results on standard output, failures and warnings on
/// standard error. In a dry run nothing is done, only told. A quiet one tells failures and warnings only.
///
/// One thread.
class Worklog {
public:
    explicit Worklog(bool isDryRun, bool isQuiet = false) : m_isDryRun(isDryRun), m_isQuiet(isQuiet) {}

    /// `thing` needs nothing.
    void AlreadyDone(const std::string& thing);

    /// Does `action` to `thing` unless this is a dry run. AlreadyThere means AlreadyDone. Any other exception
    /// from it is told as a failure, followed by `advice`. Returns false after a failure.
    bool Run(const Verb& verb, const std::string& thing, const std::function<void()>& action,
             const std::string& advice = {});

    /// Something could not be done; `text` says what, and what to do about it.
    void Fail(const std::string& text);

    /// Something was done as asked, but will not do what the person wants.
    void Warn(const std::string& text) const;

    bool IsDryRun() const { return m_isDryRun; }

    /// Says the last word. True when nothing failed.
    bool Summarise() const;

private:
    void Say(const std::string& line) const;

    bool m_isDryRun;
    bool m_isQuiet;
    bool m_hasChanged = false;
    bool m_hasFailed = false;
};

} // namespace reportctl::terminal
