#pragma once

#include <cstddef>
#include <stdexcept>
#include <string>

#include <boost/format.hpp>

// Builds the texts of log records. A datagram is a format string by design. So a datagram of twenty bytes may
// ask for a tabulation to column 2,000,000,000, and one of 10,240 bytes for five thousand arguments. The
// limits here make sure that a datagram's log line is about as long as the datagram, and takes the receiving
// thread little time.
namespace SyncServiceReport {

/// A text over this size counts as one that cannot be built.
inline constexpr std::size_t MAX_LOG_TEXT_BYTES = std::size_t{1024} * 1024;

/// A text whose directives make it longer than its format by more than this counts as one that cannot be
/// built, too. Otherwise a few kilobytes of datagrams would fill the log and push out everything else.
inline constexpr std::size_t MAX_LOG_TEXT_GROWTH_BYTES = 4096;

/// Whether `format` without arguments gives exactly `format` as its text. Most datagrams do, and then no
/// parse and no copy is needed.
inline bool IsOwnText(const std::string& format) {
    return format.size() <= MAX_LOG_TEXT_BYTES && format.find('%') == std::string::npos;
}

/// The text that boost::format gives for `format` without arguments. `format` may be a text from outside.
/// Throws what boost::format throws. Throws std::length_error for a text beyond the sizes above, which is not
/// built, and for a directive with a number of more than nine digits: no shorter text needs such a number.
std::string BuildLogText(const std::string& format);

/// The text that `format` gives with arguments. `format` must be our own text and never one from outside: an
/// argument is padded to the format's width before the size of the text is known. Throws what boost::format
/// throws for a format that does not fit the arguments, and std::length_error for a text over
/// MAX_LOG_TEXT_BYTES.
template <typename Argument, typename... Arguments>
std::string BuildLogText(const std::string& format, const Argument& first, const Arguments&... others) {
    boost::format text(format);
    text % first;
    (static_cast<void>(text % others), ...);
    // When arguments are missing, str() below throws: boost::format has the better error text for that.
    if (text.remaining_args() == 0 && text.size() > MAX_LOG_TEXT_BYTES)
        throw std::length_error("the text would have " + std::to_string(text.size()) +
                                " bytes, more than the " + std::to_string(MAX_LOG_TEXT_BYTES) +
                                " of a log record");
    return text.str();
}

} // namespace SyncServiceReport
