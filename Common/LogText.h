#pragma once

#include <cstddef>
#include <stdexcept>
#include <string>
#include <string_view>

#include <boost/format.hpp>

// Builds the texts of log records. A datagram is a format string by design, so one of twenty bytes may ask
// for a tabulation to column 2,000,000,000. It must cost a log line and not gigabytes.
namespace SyncServiceReport {

/// A text over this size counts as one that cannot be built.
inline constexpr std::size_t MAX_LOG_TEXT_BYTES = 1024 * 1024;

/// Throws std::length_error when a directive of `format` has a number of more than nine digits. No text
/// within the size limit has one, and boost::format would compute with it beyond the range of its integers.
inline void CheckNumbersOfDirectives(const std::string& format) {
    constexpr int MAX_DIGITS = 9;
    constexpr std::string_view BESIDE_NUMBERS = "|-+ #'_=.*$"; // what may stand before and between them
    for (auto at = format.find('%'); at != std::string::npos; at = format.find('%', at)) {
        ++at;
        if (format[at] == '%') {
            ++at; // a doubled sign is a sign
            continue;
        }
        for (int digits = 0;; ++at) {
            const char next = format[at]; // a zero byte at the end
            if (next >= '0' && next <= '9')
                digits += digits > 0 || next != '0' ? 1 : 0;
            else if (BESIDE_NUMBERS.find(next) != std::string_view::npos)
                digits = 0;
            else
                break;
            if (digits > MAX_DIGITS)
                throw std::length_error("a directive of the text has a number of more than 9 digits");
        }
    }
}

/// The text that `format` gives with `arguments`. Throws what boost::format throws for a format that does not
/// fit, and std::length_error for a text over MAX_LOG_TEXT_BYTES, before that is built.
template <typename... Arguments>
std::string BuildLogText(const std::string& format, const Arguments&... arguments) {
    CheckNumbersOfDirectives(format);
    boost::format text(format);
    (static_cast<void>(text % arguments), ...);
    // A format that lacks arguments is left to boost::format, whose own words are the better ones.
    if (text.remaining_args() == 0 && text.size() > MAX_LOG_TEXT_BYTES)
        throw std::length_error("the text would have " + std::to_string(text.size()) +
                                " bytes, more than the " + std::to_string(MAX_LOG_TEXT_BYTES) +
                                " of a log record");
    return text.str();
}

} // namespace SyncServiceReport
