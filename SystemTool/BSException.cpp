#include "SystemTool/BSException.h"

#include <boost/exception/get_error_info.hpp>

#include "SystemTool/Clock/DateTime.h"

namespace SystemTool {

std::string BSException::ErrorMsg() const {
    const auto* attached = boost::get_error_info<BSErrorText>(*this);
    return "[" + Clock::DateTime::Now().ToString("%Y-%m-%d %H:%M:%S") + "]" + "[STL ERR] " + what() + " " +
           "[BOOST ERR] " + (attached != nullptr ? *attached : std::string()) + "\n";
}

} // namespace SystemTool
