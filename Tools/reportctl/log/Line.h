#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "Tools/reportctl/terminal/TimeArgument.h"

/// The service's log, as docs/Log.md describes it.
namespace reportctl::log {

/// One record, taken apart.
struct Line {
    terminal::TimePoint time;
    std::string stamp; ///< the time as it stands in the log: local, without a zone
    int level = 0;     ///< 1 to 5 for DEBUG to FATAL
    std::string process;
    std::string site;     ///< such as "App/ReportServer"
    std::string function; ///< such as "Recv"
    std::string message;  ///< the original bytes
};

/// Reads a line without its line feed. Nothing for what is no record, such as the half line that a full disk
/// leaves.
std::optional<Line> ReadLine(std::string_view text);

/// The text that the log wrote with escapes. What is no escape stays as it is.
std::string Unescaped(std::string_view text);

/// The level of a word such as "WARN", or of the number that the log writes for another level; 0 for anything
/// else.
int LevelOf(std::string_view word);

} // namespace reportctl::log
