#pragma once

#include <string>

#include <boost/dll/shared_library.hpp>

namespace SystemTool {

/// A shared library that is opened at run time. The destructor closes it. One thread at a time. A symbol of
/// the library must not be used after Unload.
class DllLoader : public boost::dll::shared_library {
public:
    /// Opens the library at `path`, which is used exactly as given (no prefix, no suffix). All its symbols
    /// are resolved at once, so that an incomplete library fails here and not in the middle of a call. A
    /// library that was open before is closed first. False on failure; GetLastError then gives the reason.
    bool Load(const std::string& path);

    bool IsLoad() const { return is_loaded(); }

    /// Whether the open library exports `name`; false when none is open.
    bool IsHasFunc(const std::string& name) const { return is_loaded() && has(name); }

    void Unload() { unload(); }

    /// Why the last failed Load failed: the path and the system's own words. Empty before a failure.
    const std::string& GetLastError() const { return m_strLastError; }

private:
    std::string m_strLastError;
};

} // namespace SystemTool
