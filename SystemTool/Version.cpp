#include "SystemTool/Version.h"

#include "SystemTool/Platform.h"

namespace SystemTool::Version {

const char* Number() {
    return SSR_VERSION;
}

std::string BuildId() {
    return Of(Platform::OwnProgramFile()).buildId;
}

} // namespace SystemTool::Version
