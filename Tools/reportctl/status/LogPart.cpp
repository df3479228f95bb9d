#include <algorithm>
#include <filesystem>
#include <fstream>

#include <fmt/format.h>

#include "Tools/reportctl/log/Files.h"
#include "Tools/reportctl/log/Line.h"
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

/// Returns nothing when the line's level is lower than a warning, or when the line is not a record. It looks
/// at the level first: most lines have a lower one, and reading a line takes longer.
std::optional<Log::Line> WarningOrErrorIn(std::string_view text) {
    const auto level = log::LevelIn(text);
    if (level != log::WARN && level != log::ERROR && level != log::FATAL)
        return std::nullopt;
    auto line = log::ReadLine(text);
    if (!line)
        return std::nullopt;
    return Log::Line{line->time.time_since_epoch().count(), log::WordFor(line->level),
                     fmt::format("{}:{} {}", line->site, line->number, line->function),
                     std::move(line->message)};
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

/// The log's newest part: the end of the live file, and before it that of the newest rotated one, where there
/// is room.
std::string NewestPart(const std::string& directory) {
    auto newest = EndOf(log::LiveFile(directory), MOST_READ);
    for (const auto& rotated : log::LastRotatedFiles(directory, 1))
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
    std::error_code error;
    for (const auto& entry : fs::directory_iterator(directory, error)) {
        std::error_code gone; // set when the file was rotated or deleted meanwhile
        const auto size = entry.file_size(gone);
        log.bytes += gone ? 0 : size;
    }
    const auto text = NewestPart(directory);
    std::string_view rest = text;
    for (auto end = rest.find('\n'); end != std::string_view::npos; end = rest.find('\n')) {
        if (auto line = WarningOrErrorIn(rest.substr(0, end)))
            Take(log, std::move(*line), nowMs);
        rest.remove_prefix(end + 1);
    }
    return log;
}

} // namespace reportctl::status
