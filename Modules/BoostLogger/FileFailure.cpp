#include "Modules/BoostLogger/FileFailure.h"

#include "SystemTool/Errno.h"

namespace BoostLogger {

std::string FileFailure::Text() const {
    return std::string("cannot ") + step + ": " + SystemTool::ErrnoText(error);
}

} // namespace BoostLogger
