#pragma once

#include <string_view>

namespace BoostLogger {

/// The arguments of one WriteLog; valid while that call lasts.
struct LogRecord {
    int level = 0;
    std::string_view tag;
    std::string_view file;
    std::string_view function;
    int line = 0;
    std::string_view message;
};

} // namespace BoostLogger
