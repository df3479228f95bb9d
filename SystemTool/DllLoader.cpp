#include "SystemTool/DllLoader.h"

namespace SystemTool {

bool DllLoader::Load(const std::string& path) {
    try {
        load(path, boost::dll::load_mode::rtld_now | boost::dll::load_mode::rtld_local);
        return true;
    } catch (const std::exception& error) {
        // We use the form of load that throws. The two forms that return an error code lose the system's own
        // words ("file too short", "undefined symbol: ..."), and a person needs those.
        m_strLastError = "Cannot open the library " + path + ": " + error.what();
        return false;
    }
}

} // namespace SystemTool
