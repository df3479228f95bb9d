#include "Tools/reportctl/log/Files.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <filesystem>
#include <map>

#include <sys/stat.h>
#include <unistd.h>

#include "Common/Paths.h"
#include "SystemTool/CommonTool.h"
#include "SystemTool/Errno.h"

namespace reportctl::log {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view PREFIX = "Report_";
constexpr std::string_view SUFFIX = ".log";

/// A file that is gone meanwhile was written before every time.
terminal::TimePoint LastWritten(const std::string& path) {
    struct stat status {};
    if (::stat(path.c_str(), &status) != 0)
        return terminal::TimePoint::min();
    return terminal::TimePoint(std::chrono::seconds(status.st_mtim.tv_sec + 1));
}

} // namespace

std::optional<std::uint64_t> NumberOf(const std::string& path) {
    const std::string name = fs::path(path).filename();
    if (!name.starts_with(PREFIX) || !name.ends_with(SUFFIX))
        return std::nullopt;
    const auto* const begin = name.data() + PREFIX.size();
    const auto* const end = name.data() + name.size() - SUFFIX.size();
    std::uint64_t number = 0;
    const auto read = std::from_chars(begin, end, number);
    return read.ec == std::errc() && read.ptr == end && begin != end ? std::optional(number) : std::nullopt;
}

std::string LogDirectory() {
    return SyncServiceReport::Paths::ServiceLogs(SystemTool::CommonTool::GetUserDataDir());
}

std::string LiveFile(const std::string& directory) {
    return directory + "/Report.log";
}

std::string ReasonAgainst(const std::string& path) {
    struct stat status {};
    if (::access(path.c_str(), R_OK) != 0 || ::stat(path.c_str(), &status) != 0)
        return SystemTool::ErrnoText(errno);
    return S_ISREG(status.st_mode) ? "" : "it is no file";
}

std::vector<std::string> RotatedFiles(const std::string& directory) {
    std::map<std::uint64_t, std::string> byNumber;
    std::error_code error;
    fs::directory_iterator entry(directory, error);
    for (; !error && entry != fs::directory_iterator(); entry.increment(error))
        if (const auto number = NumberOf(entry->path()))
            byNumber[*number] = entry->path();
    std::vector<std::string> files;
    files.reserve(byNumber.size());
    for (auto& [number, path] : byNumber)
        files.push_back(std::move(path));
    return files;
}

std::vector<std::string> RotatedFilesSince(const std::string& directory, terminal::TimePoint since) {
    auto files = RotatedFiles(directory);
    const auto first = std::find_if(files.begin(), files.end(),
                                    [&](const auto& file) { return LastWritten(file) >= since; });
    return {first, files.end()};
}

std::vector<std::string> LastRotatedFiles(const std::string& directory, std::size_t count) {
    const auto files = RotatedFiles(directory);
    return {files.end() - static_cast<std::ptrdiff_t>(std::min(count, files.size())), files.end()};
}

} // namespace reportctl::log
