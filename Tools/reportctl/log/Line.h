#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "Tools/reportctl/terminal/TimeArgument.h"

/// The service's log, as docs/Log.md describes it.
namespace reportctl::log {

inline constexpr int DEBUG = 1;
inline constexpr int INFO = 2;
inline constexpr int WARN = 3;
inline constexpr int ERROR = 4;
inline constexpr int FATAL = 5;

/// One record of the log, split into its parts.
struct Line {
    terminal::TimePoint time;
    std::string stamp; ///< the time as it stands in the log: local, without a zone
    int level = 0;     ///< DEBUG to FATAL, or another number
    std::string process;
    std::string site;     ///< such as "App/ReportServer"
    std::string number;   ///< the line of that file
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

/// The word of a level, such as "WARN". Empty for a level that has no word.
std::string WordFor(int level);

/// Reads the level only, which is quick. Returns 0 when the line is not a record.
int LevelIn(std::string_view text);

} // namespace reportctl::log
