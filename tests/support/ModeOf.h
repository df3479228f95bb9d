#pragma once

#include <filesystem>

#include <sys/stat.h>

/// The rights of a file or directory, such as 0600; 0 when it does not exist.
inline mode_t ModeOf(const std::filesystem::path& path) {
    struct stat status {};
    return ::stat(path.c_str(), &status) == 0 ? status.st_mode & 07777 : 0;
}
