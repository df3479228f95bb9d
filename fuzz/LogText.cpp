// A text from outside as the log's format string, up to the line in the log. Any text must give one record,
// with what boost::format makes of it, within the size limits, and one line that the text cannot break.

#include <algorithm>
#include <chrono>

#include "Common/Logger.h"
#include "Modules/BoostLogger/RecordLine.h"
#include "fuzz/support/Input.h"
#include "fuzz/support/Require.h"
#include "tests/fakes/FakeLogger.h"

using namespace SyncServiceReport;

namespace {

constexpr LogSite SITE{LogLevel::Info, "LogText", 7};
constexpr std::string_view ERROR_MARK = "[BoostLogError]";

template <typename... Arguments>
LogRecord Logged(FakeLoggerState& logger, const std::string& format, const Arguments&... arguments) {
    logger.Clear();
    WriteLog(SITE, format, arguments...);
    const auto records = logger.Records();
    RequireEqual(records.size(), 1U, "one record for one text");
    const LogRecord& record = records.front();
    const bool isError = record.level == static_cast<int>(LogLevel::Error);
    const int level = static_cast<int>(isError ? LogLevel::Error : LogLevel::Info);
    RequireEqual(record, (LogRecord{level, "fuzz/LogText", "LogText", 7, record.message}),
                 "the record's site");
    if (isError)
        Require(record.message.starts_with(ERROR_MARK), "a text that cannot be built says so",
                record.message);
    Require(record.message.size() <= MAX_LOG_TEXT_BYTES, "a record stays within its size");
    return record;
}

bool IsControl(char byte) {
    return static_cast<unsigned char>(byte) < 0x20 || byte == 0x7f;
}

/// Requires that the plug-in makes one line of the record, that the line has no effect on a terminal, and
/// that it does not look like something else.
void RequireOneHarmlessLine(const LogRecord& record) {
    BoostLogger::LineBuffer buffer;
    BoostLogger::ComposeLine(buffer,
                             {.level = record.level,
                              .tag = record.tag,
                              .file = record.file,
                              .function = record.function,
                              .line = record.line,
                              .message = record.message},
                             std::chrono::system_clock::now());
    const std::string_view line = BoostLogger::TextOf(buffer);
    Require(line.ends_with('\n'), "a line ends", line);
    Require(std::ranges::none_of(line.substr(0, line.size() - 1), IsControl),
            "a line has no control character", line);
    for (std::size_t at = 0; (at = line.find('\xc2', at)) != std::string::npos; ++at)
        Require(static_cast<unsigned char>(line[at + 1]) >= 0xa0, "nor one of those beyond ASCII", line);
    for (const auto* mark : {"\u2028", "\u2029", "\u202a", "\u202e", "\u2066", "\u2069"})
        Require(line.find(mark) == std::string::npos, "nor one that ends or turns the line", line);
}

/// Whether a number is so long that boost::format would calculate with it beyond the range of its integers.
bool HasALongNumber(std::string_view text) {
    const auto isDigit = [](char byte) { return byte >= '0' && byte <= '9'; };
    const auto same = [&](char byte, bool wanted) { return isDigit(byte) == wanted; };
    return std::search_n(text.begin(), text.end(), 10, true, same) != text.end();
}

/// A boost::format object with enough room. boost::format makes room for the directives that it counts, but
/// counts one too few for a tabulation whose fill is a percent sign. An object that has parsed as many
/// directives as the text has percent signs keeps the room for them.
boost::format WithRoom(const std::string& text) {
    std::string roomy;
    for (auto count = std::ranges::count(text, '%'); count > 0; --count)
        roomy += "%1%";
    boost::format format(roomy);
    format.parse(text);
    return format;
}

/// What boost::format itself makes of the text, in the form of the record's message.
std::string FormattedByBoost(const std::string& text) {
    try {
        const boost::format format = WithRoom(text);
        const auto bytes = format.size();
        if (format.remaining_args() == 0 &&
            bytes > std::min(text.size() + MAX_LOG_TEXT_GROWTH_BYTES, MAX_LOG_TEXT_BYTES))
            throw std::length_error("the text would grow from " + std::to_string(text.size()) + " to " +
                                    std::to_string(bytes) + " bytes, too many for a log record");
        return format.str();
    } catch (const std::exception& error) {
        return std::string(ERROR_MARK) + error.what();
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static FakeLoggerState& logger = FakeLogger();
    const std::string text = TextOf(data, size);
    const LogRecord record = Logged(logger, text);
    if (text.find('%') == std::string::npos)
        RequireEqual(record, (LogRecord{2, "fuzz/LogText", "LogText", 7, text}),
                     "a plain text stays as it is");
    else if (!HasALongNumber(text))
        RequireEqual(record.message, FormattedByBoost(text), "the text is what boost::format makes of it");
    Require(record.message.size() <= text.size() + MAX_LOG_TEXT_GROWTH_BYTES, "a text hardly grows");
    RequireOneHarmlessLine(record);
    // As an argument, a text is never a format. (Nowhere in the service does a text from outside that is used
    // as the format have arguments.)
    const std::string both = text + "-" + text;
    if (both.size() <= MAX_LOG_TEXT_BYTES)
        RequireEqual(Logged(logger, "%s-%s", text, text).message, both, "an argument stays as it is");
    return 0;
}
