#include <algorithm>
#include <array>
#include <charconv>
#include <ctime>
#include <filesystem>
#include <fstream>

#include "Tools/reportctl/status/Parts.h"

namespace reportctl::status {
namespace {

namespace fs = std::filesystem;

/// How much of the log's end is read: some thousand lines, in a few milliseconds.
constexpr std::uintmax_t MOST_READ = std::uintmax_t{1024} * 1024;
constexpr std::size_t MOST_SHOWN = 5;
constexpr std::int64_t RECENT_MS = 600'000;

/// The place in the service that logs when the outbox has a failure, and when the failure is over.
constexpr std::string_view OUTBOX_SITE = "Metrik/MetrikWorker:21 FailCallBackFun";

constexpr std::size_t STAMP_BYTES = 23; // 2026-11-20 10:15:30.123

int NumberAt(std::string_view text, std::size_t at, std::size_t digits) {
    int number = 0;
    std::from_chars(text.data() + at, text.data() + at + digits, number);
    return number;
}

/// The milliseconds since 1970 of a time in the log, which is local time.
std::int64_t MillisecondsOf(std::string_view stamp) {
    std::tm local{};
    local.tm_year = NumberAt(stamp, 0, 4) - 1900;
    local.tm_mon = NumberAt(stamp, 5, 2) - 1;
    local.tm_mday = NumberAt(stamp, 8, 2);
    local.tm_hour = NumberAt(stamp, 11, 2);
    local.tm_min = NumberAt(stamp, 14, 2);
    local.tm_sec = NumberAt(stamp, 17, 2);
    local.tm_isdst = -1;
    return std::int64_t{std::mktime(&local)} * 1000 + NumberAt(stamp, 20, 3);
}

/// Reads a line such as "2026-11-20 10:15:30.123 ERROR [pid:tid] [App/ReportServer:42 Recv] message". Returns
/// nothing when the line's level is lower than a warning, or when the line is not a record.
std::optional<Log::Line> WarningOrErrorIn(std::string_view text) {
    if (text.size() < STAMP_BYTES + 7 || text[4] != '-' || text[19] != '.')
        return std::nullopt;
    const auto level = text.substr(STAMP_BYTES + 1, 5);
    if (level != "WARN " && level != "ERROR" && level != "FATAL")
        return std::nullopt;
    const auto site = text.find("] [");
    const auto end = text.find("] ", site + 3);
    if (site == std::string_view::npos || end == std::string_view::npos)
        return std::nullopt;
    return Log::Line{MillisecondsOf(text.substr(0, STAMP_BYTES)),
                     std::string(level.substr(0, level.find(' '))),
                     std::string(text.substr(site + 3, end - site - 3)), std::string(text.substr(end + 2))};
}

/// The last `bytes` of a file, from the first beginning of a line in them.
std::string EndOf(const fs::path& path, std::uintmax_t bytes) {
    std::error_code error;
    const auto size = fs::file_size(path, error);
    std::ifstream file(path, std::ios::binary);
    if (error || !file)
        return {};
    const auto skipped = size - std::min(size, bytes);
    file.seekg(static_cast<std::streamoff>(skipped));
    std::string text(std::min(size, bytes), '\0');
    file.read(text.data(), static_cast<std::streamsize>(text.size()));
    text.resize(static_cast<std::size_t>(file.gcount()));
    return skipped == 0 ? text : text.substr(std::min(text.find('\n'), text.size() - 1) + 1);
}

/// The number in "Report_<number>.log", which grows with each rotated file; 0 for another name.
int NumberOf(const fs::path& path) {
    const std::string name = path.filename().string();
    return name.starts_with("Report_") && name.ends_with(".log") ? NumberAt(name, 7, name.size() - 11) : 0;
}

/// The newest part of the log: the end of the live file. When that is shorter than MOST_READ, the end of the
/// newest rotated file comes before it.
std::string NewestPart(const std::string& directory, const fs::path& rotated) {
    auto newest = EndOf(directory + "/Report.log", MOST_READ);
    if (!rotated.empty() && newest.size() < MOST_READ)
        newest.insert(0, EndOf(rotated, MOST_READ - newest.size()));
    return newest;
}

void Take(Log& log, Log::Line line, std::int64_t nowMs) {
    if (line.site == OUTBOX_SITE)
        log.lastFromOutbox = line;
    if (nowMs - line.atMs <= RECENT_MS)
        ++(line.level == "WARN" ? log.warnings : log.errors);
    log.last.push_back(std::move(line));
    if (log.last.size() > MOST_SHOWN)
        log.last.erase(log.last.begin());
}

} // namespace

Log LookAtLog(const std::string& directory, std::int64_t nowMs) {
    Log log;
    log.directory = directory;
    fs::path rotated;
    std::error_code error;
    for (const auto& entry : fs::directory_iterator(directory, error)) {
        std::error_code gone; // set when the file was rotated or deleted meanwhile
        const auto size = entry.file_size(gone);
        log.bytes += gone ? 0 : size;
        if (NumberOf(entry.path()) > NumberOf(rotated))
            rotated = entry.path();
    }
    const auto text = NewestPart(directory, rotated);
    std::string_view rest = text;
    for (auto end = rest.find('\n'); end != std::string_view::npos; end = rest.find('\n')) {
        if (auto line = WarningOrErrorIn(rest.substr(0, end)))
            Take(log, std::move(*line), nowMs);
        rest.remove_prefix(end + 1);
    }
    return log;
}

} // namespace reportctl::status
