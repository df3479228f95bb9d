#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

/// A row of the store as a line of text.
namespace reportctl::store {

/// What an export holds of a row. A text that the store does not have is nullopt.
struct ReportRow {
    using Text = std::optional<std::string_view>;

    std::int64_t id = 0;
    Text at;
    Text event;
    Text module;
    Text action;
    Text value;
    bool isJson = false; ///< `value` is the JSON text of an object or an array
    Text openid;
    Text suiteVersion;
    Text createTime;
};

inline constexpr std::string_view CSV_HEADER =
    "id,at,event,module,action,value,openid,suite_version,create_time\n";

/// Appends a line by RFC 4180, but for the line's end, which is a line feed: a field with a comma, a quote or
/// a line's end is in quotes. NULL is an empty field, an empty text is "". What is no UTF-8 becomes U+FFFD.
void AppendCsv(std::string& out, const ReportRow& row);

/// Appends one JSON object with the names of CSV_HEADER, and a line feed. A value that is an object or an
/// array stands as such, everything else but the id is a string or null. What is no UTF-8 becomes U+FFFD.
void AppendJsonLine(std::string& out, const ReportRow& row);

} // namespace reportctl::store
