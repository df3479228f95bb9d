#pragma once

#include <algorithm>
#include <cstddef>
#include <stdexcept>
#include <string>
#include <string_view>

#include <boost/format.hpp>

// Builds the texts of log records. A datagram is a format string by design, so one of twenty bytes may ask
// for a tabulation to column 2,000,000,000. It must cost a log line and not gigabytes.
namespace SyncServiceReport {

/// A text over this size counts as one that cannot be built.
inline constexpr std::size_t MAX_LOG_TEXT_BYTES = std::size_t{1024} * 1024;

/// Throws std::length_error when a directive of `format` has a number of more than nine digits. No text within the size
/// limit has one, and boost::format would compute with it beyond the range of its integers. Walks the directives step by
/// step as boost::format's parser does; text between them may hold any number.
inline void CheckNumbersOfDirectives(const std::string& format) {
    constexpr std::size_t MAX_DIGITS = 9;
    std::size_t at = 0;
    const auto isAt = [&](std::string_view set) {
        return at < format.size() && set.find(format[at]) != std::string_view::npos;
    };
    const auto skip = [&](std::string_view set) {
        while (isAt(set))
            ++at;
    };
    const auto skipNumber = [&] {
        const auto begin = at;
        skip("0");
        const auto significant = at;
        skip("0123456789");
        if (at - significant > MAX_DIGITS)
            throw std::length_error("a directive of the text has a number of more than 9 digits");
        return at > begin;
    };
    const auto skipWidth = [&] { // or precision
        if (isAt("*"))
            ++at;
        else
            skipNumber();
    };
    while ((at = format.find('%', at)) != std::string::npos) {
        ++at;
        if (isAt("%")) { // a doubled sign is a sign
            ++at;
            continue;
        }
        const bool inBars = isAt("|");
        at += inBars ? 1 : 0;
        bool hasWidth = false;
        if (!isAt("0") && skipNumber()) { // an argument's number, or a width
            if (isAt("%")) {
                ++at;
                continue;
            }
            hasWidth = !isAt("$");
            at += hasWidth ? 0 : 1;
        }
        if (!hasWidth) {
            skip("'-=_ +0#");
            skipWidth();
        }
        if (isAt(".")) {
            ++at;
            skipWidth();
        }
        skip("hljzLwI3264"); // argument types
        if (inBars && isAt("|"))
            ++at;
        else if (isAt("T"))
            at += 2; // the next character is its fill, be it a percent sign
        else
            at += isAt("%") ? 0 : 1;
    }
}

/// `format`, parsed. boost::format 1.81 makes room for the directives that it counts before it parses, and counts a
/// tabulation whose fill is a percent sign (`%1T%%|9t|`) as one too few: parsing then writes behind its array, and a
/// datagram of such could end the service. A format that has been parsed before keeps its room, so one with as many
/// directives as there are percent signs comes first.
inline boost::format ParsedFormat(const std::string& format) {
    std::string roomy;
    for (auto count = std::count(format.begin(), format.end(), '%'); count > 0; --count)
        roomy += "%1%";
    boost::format parsed(roomy);
    parsed.parse(format);
    return parsed;
}

/// Whether `format` without arguments gives itself. Most datagrams are such, and need neither a parse nor a copy.
inline bool IsOwnText(const std::string& format) {
    return format.size() <= MAX_LOG_TEXT_BYTES && format.find('%') == std::string::npos;
}

/// The text that `format` gives with `arguments`. Throws what boost::format throws for a format that does not
/// fit, and std::length_error for a text over MAX_LOG_TEXT_BYTES, before that is built, or for a directive with a number
/// that no smaller text can have. A format from outside must come without arguments: an argument is built to the format's
/// width before the text's size is known.
template <typename... Arguments>
std::string BuildLogText(const std::string& format, const Arguments&... arguments) {
    CheckNumbersOfDirectives(format);
    boost::format text = ParsedFormat(format);
    (static_cast<void>(text % arguments), ...);
    // A format that lacks arguments is left to boost::format, whose own words are the better ones.
    if (text.remaining_args() == 0 && text.size() > MAX_LOG_TEXT_BYTES)
        throw std::length_error("the text would have " + std::to_string(text.size()) +
                                " bytes, more than the " + std::to_string(MAX_LOG_TEXT_BYTES) +
                                " of a log record");
    return text.str();
}

} // namespace SyncServiceReport
