#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "Tools/reportctl/terminal/TimeArgument.h"

namespace reportctl::log {

/// The directory that this user's service writes its log into.
std::string LogDirectory();

/// The path of the file that the service writes now, "Report.log". The file need not exist.
std::string LiveFile(const std::string& directory);

/// The system's message why the file cannot be read now; empty when it can be read.
std::string ReasonAgainst(const std::string& path);

/// The number in a rotated file's name. Returns nothing for other files.
std::optional<std::uint64_t> NumberOf(const std::string& path);

/// The rotated files, oldest first. Their numbers give the order; the times of the files do not.
std::vector<std::string> RotatedFiles(const std::string& directory);

/// The files of RotatedFiles that may hold a line from `since` on.
std::vector<std::string> RotatedFilesSince(const std::string& directory, terminal::TimePoint since);

/// The last `count` of RotatedFiles.
std::vector<std::string> LastRotatedFiles(const std::string& directory, std::size_t count);

} // namespace reportctl::log
