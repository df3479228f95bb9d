#include <algorithm>
#include <filesystem>
#include <fstream>
#include <unordered_map>

#include <fmt/format.h>

#include "Tools/reportctl/log/Files.h"
#include "Tools/reportctl/log/Line.h"
#include "Tools/reportctl/status/Parts.h"
#include "Tools/reportctl/status/Recent.h"

namespace reportctl::status {
namespace {

namespace fs = std::filesystem;

/// How much of the log's end is read: some thousand lines, in a few milliseconds.
constexpr std::uintmax_t MOST_READ = std::uintmax_t{1024} * 1024;
constexpr std::size_t MOST_SHOWN = 5;

/// The place in the service that logs when the outbox has a failure, and when the failure is over.
constexpr std::string_view OUTBOX_SITE = "Metrik/MetrikWorker:21 FailCallBackFun";

/// Returns nothing when the line's level is lower than a warning, or when the line is not a record. It looks
/// at the level first: most lines have a lower one, and reading a line takes longer.
std::optional<log::Line> WarningOrErrorIn(std::string_view text) {
    const auto level = log::LevelIn(text);
    if (level != log::WARN && level != log::ERROR && level != log::FATAL)
        return std::nullopt;
    return log::ReadLine(text);
}

Log::Line Shown(log::Line line) {
    return {line.time.time_since_epoch().count(), log::WordFor(line.level),
            fmt::format("{}:{} {}", line.site, line.number, line.function), std::move(line.message)};
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

template <typename Item>
void AddToTheLast(std::vector<Item>& last, Item item) {
    last.push_back(std::move(item));
    if (last.size() > MOST_SHOWN)
        last.erase(last.begin());
}

/// Reads the warnings and errors of a log, from the oldest to the newest.
class Reading {
public:
    Reading(Log& log, const LogWriter& writer, std::int64_t nowMs)
        : m_log(log), m_writer(writer), m_nowMs(nowMs) {}

    void Take(log::Line read) {
        const bool isWriters = read.process == m_writer.process;
        auto line = Shown(std::move(read));
        if (isWriters && line.site == OUTBOX_SITE && line.atMs >= m_writer.startedAtMs)
            TakeOutboxLine(m_log.fromOutbox, line);
        if (IsRecent(line.atMs, m_nowMs))
            ++(line.level == "WARN" ? m_log.warnings : m_log.errors);
        CountText(line);
        AddToTheLast(m_log.last, std::move(line));
    }

private:
    void CountText(const Log::Line& line) {
        const auto key = line.level + line.site + line.text;
        std::erase_if(m_log.lastTexts, [&](const Log::Repeated& earlier) {
            return earlier.line.level + earlier.line.site + earlier.line.text == key;
        });
        AddToTheLast(m_log.lastTexts, Log::Repeated{line, ++m_times[key]});
    }

    Log& m_log;
    const LogWriter& m_writer;
    std::int64_t m_nowMs;
    std::unordered_map<std::string, int> m_times;
};

} // namespace

Log LookAtLog(const std::string& directory, const LogWriter& writer, std::int64_t nowMs) {
    Log log;
    Reading reading(log, writer, nowMs);
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
            reading.Take(std::move(*line));
        rest.remove_prefix(end + 1);
    }
    return log;
}

} // namespace reportctl::status
