#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "Tools/reportctl/terminal/TimeArgument.h"

/// The service's log, as docs/Log.md describes it.
namespace reportctl::log {

/// One record of the log, split into its parts.
struct Line {
    terminal::TimePoint time;
    std::string stamp; ///< the time as the log writes it: local, without a zone
    int level = 0;     ///< 1 to 5 for DEBUG to FATAL
    std::string process;
    std::string site;     ///< such as "App/ReportServer"
    std::string function; ///< such as "Recv"
    std::string message;  ///< the original bytes, without the log's escapes
};

/// Reads a line, which has no line feed. Returns nothing when the line is not a record, for example half a
/// line that a full disk left.
std::optional<Line> ReadLine(std::string_view text);

/// Replaces the log's escapes by the original characters. Everything else stays as it is.
std::string Unescaped(std::string_view text);

/// The level that a word of the log means: a name such as "WARN", or the number that the log writes for a
/// level without a name. 0 for any other word.
int LevelOf(std::string_view word);

} // namespace reportctl::log
