#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "Tools/reportctl/terminal/TimeArgument.h"

namespace reportctl::log {

/// The directory of the log of this user's service.
std::string LogDirectory();

/// The file that is being written, "Report.log", whether it is there or not.
std::string LiveFile(const std::string& directory);

/// Why the file cannot be read now, in the system's words; empty when it can.
std::string ReasonAgainst(const std::string& path);

/// The rotated files, oldest first. Their numbers tell their age; their times do not.
std::vector<std::string> RotatedFiles(const std::string& directory);

/// Those of RotatedFiles that may hold a line of `since` or later.
std::vector<std::string> RotatedFilesSince(const std::string& directory, terminal::TimePoint since);

/// The last `count` of RotatedFiles.
std::vector<std::string> LastRotatedFiles(const std::string& directory, std::size_t count);

} // namespace reportctl::log
