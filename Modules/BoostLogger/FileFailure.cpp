#include "Modules/BoostLogger/FileFailure.h"

#include <system_error>

namespace BoostLogger {

std::string FileFailure::Text() const {
    return std::string("cannot ") + step + ": " + std::generic_category().message(error);
}

} // namespace BoostLogger
