#include "SystemTool/DllLoader.h"

namespace SystemTool {

bool DllLoader::Load(const std::string& path) {
    try {
        load(path, boost::dll::load_mode::rtld_now | boost::dll::load_mode::rtld_local);
        return true;
    } catch (const std::exception& error) {
        // Of the two forms that take no exception, neither keeps the system's own words ("file too short",
        // "undefined symbol: ..."), which are what a person needs.
        m_strLastError = "Cannot open the library " + path + ": " + error.what();
        return false;
    }
}

} // namespace SystemTool
