#include "SystemTool/CommonTool.h"

#include "SystemTool/Platform.h"

namespace SystemTool::CommonTool {

std::string GetUserDataDir() {
    return Platform::UserDataDir();
}

std::string GetOSVersionString() {
    return Platform::OSVersionString();
}

} // namespace SystemTool::CommonTool
