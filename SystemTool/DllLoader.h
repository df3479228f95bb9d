#pragma once

#include <string>

#include <boost/dll/shared_library.hpp>

namespace SystemTool {

/// A shared library that is opened at run time. Closed by the destructor.
/// One thread at a time; a symbol that was fetched must not be used after Unload.
class DllLoader : public boost::dll::shared_library {
public:
    /// Opens the library at `path`, used exactly as given (no prefix, no suffix), with all its symbols
    /// resolved, so that an incomplete library fails here and not in the middle of a call. Returns false on
    /// failure; GetLastError then tells why. A library that was open before is closed first.
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
