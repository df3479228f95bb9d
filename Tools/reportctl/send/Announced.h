#pragma once

#include <set>
#include <string>

namespace reportctl::send {

/// The analytics modules that the running service knows, as its log tells: it logs each one that is
/// announced.
///
/// Reads the log once. Never throws: a log that cannot be read tells nothing.
class Announced {
public:
    explicit Announced(const std::string& logDirectory);

    /// Whether the service is sure to drop this module's events. False when the log does not reach back to
    /// its start.
    bool Lacks(const std::string& module) const { return m_isWhole && !m_modules.contains(module); }

    /// The module is announced now.
    void Add(const std::string& module) { m_modules.insert(module); }

private:
    void ReadFile(const std::string& path);

    std::string m_process; ///< of the service that logged last
    std::set<std::string> m_modules;
    bool m_isWhole = false;
};

} // namespace reportctl::send
