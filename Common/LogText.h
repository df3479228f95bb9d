#pragma once

#include <cstddef>
#include <stdexcept>
#include <string>

#include <boost/format.hpp>

// Builds the texts of log records. A datagram is a format string by design, so one of twenty bytes may ask
// for a tabulation to column 2,000,000,000, and one of 10,240 for five thousand arguments. It must cost a log
// line of about its own length, and little time on the receiving thread.
namespace SyncServiceReport {

/// A text over this size counts as one that cannot be built.
inline constexpr std::size_t MAX_LOG_TEXT_BYTES = std::size_t{1024} * 1024;

/// So does one that directives make longer than its format by more than this. Else a few kilobytes of
/// datagrams would fill the log and push out everything else.
inline constexpr std::size_t MAX_LOG_TEXT_GROWTH_BYTES = 4096;

/// Whether `format` without arguments gives itself. Most datagrams are such, and need neither a parse nor a
/// copy.
inline bool IsOwnText(const std::string& format) {
    return format.size() <= MAX_LOG_TEXT_BYTES && format.find('%') == std::string::npos;
}

/// The text that boost::format gives for `format` without arguments: for a text from outside. Throws what
/// boost::format throws, and std::length_error for a text beyond the sizes above, which is not built, or for
/// a directive with a number of more than nine digits, which no smaller text can have.
std::string BuildLogText(const std::string& format);

/// The text that `format` gives with arguments. Throws what boost::format throws for a format that does not
/// fit, and std::length_error for a text over MAX_LOG_TEXT_BYTES. The format is one of ours and never from
/// outside: an argument is built to the format's width before the text's size is known.
template <typename Argument, typename... Arguments>
std::string BuildLogText(const std::string& format, const Argument& first, const Arguments&... others) {
    boost::format text(format);
    text % first;
    (static_cast<void>(text % others), ...);
    // A format that lacks arguments is left to boost::format, whose own words are the better ones.
    if (text.remaining_args() == 0 && text.size() > MAX_LOG_TEXT_BYTES)
        throw std::length_error("the text would have " + std::to_string(text.size()) +
                                " bytes, more than the " + std::to_string(MAX_LOG_TEXT_BYTES) +
                                " of a log record");
    return text.str();
}

} // namespace SyncServiceReport
