#pragma once

#include <set>
#include <string>

namespace reportctl::send {

/// The analytics modules that the running service knows. The service logs each module that is announced, and
/// this class reads them from the log.
///
/// Reads the log once, in the constructor. Never throws: when the log cannot be read, no module is known to
/// be missing.
class Announced {
public:
    explicit Announced(const std::string& logDirectory);

    /// Whether it is certain that the service drops this module's events. False when the log does not reach
    /// back to the service's start.
    bool Lacks(const std::string& module) const { return m_isWhole && !m_modules.contains(module); }

    /// Call it when the module was announced after the log was read.
    void Add(const std::string& module) { m_modules.insert(module); }

private:
    void ReadFile(const std::string& path);

    std::string m_process; ///< the process that wrote the log's last line
    std::set<std::string> m_modules;
    bool m_isWhole = false; ///< the log reaches back to the process's start
};

} // namespace reportctl::send
