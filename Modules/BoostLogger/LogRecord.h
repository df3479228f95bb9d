#pragma once

#include <string_view>

namespace BoostLogger {

/// The arguments of one call of WriteLog. The texts are valid during that call.
struct LogRecord {
    int level = 0;
    std::string_view tag;
    std::string_view file;
    std::string_view function;
    int line = 0;
    std::string_view message;
};

} // namespace BoostLogger
