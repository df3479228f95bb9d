#pragma once

#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "tests/support/FileContent.h"
#include "tests/support/ModeOf.h"

inline void WriteFile(const std::filesystem::path& path, const std::string& text) {
    std::ofstream(path, std::ios::binary) << text;
}

/// The lines of a file, without their newlines. A last line without a newline counts, too.
inline std::vector<std::string> ReadLines(const std::filesystem::path& path) {
    std::ifstream file(path, std::ios::binary);
    std::vector<std::string> lines;
    for (std::string line; std::getline(file, line);)
        lines.push_back(line);
    return lines;
}

/// The rotated files of Report.log in the order of their numbers, and the live file as the last.
inline std::vector<std::filesystem::path> LogFilesOf(const std::filesystem::path& directory) {
    std::vector<std::pair<std::uint64_t, std::filesystem::path>> files;
    for (const auto& entry : std::filesystem::directory_iterator(directory)) {
        const std::string stem = entry.path().stem().string();
        files.emplace_back(stem == "Report" ? UINT64_MAX : std::stoull(stem.substr(7)), entry.path());
    }
    std::sort(files.begin(), files.end());
    std::vector<std::filesystem::path> paths;
    for (const auto& file : files)
        paths.push_back(file.second);
    return paths;
}

/// All lines of a log, the oldest first.
inline std::vector<std::string> ReadLog(const std::filesystem::path& directory) {
    std::vector<std::string> lines;
    for (const auto& path : LogFilesOf(directory))
        for (auto& line : ReadLines(path))
            lines.push_back(std::move(line));
    return lines;
}
