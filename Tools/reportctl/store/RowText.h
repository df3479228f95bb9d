#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

/// A row of the store as a line of text.
namespace reportctl::store {

/// The columns of a row that an export has. A text that is NULL in the store is nullopt.
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

/// Appends the row as a line of CSV by RFC 4180, with one exception: the line ends with a line feed alone. A
/// field with a comma, a quote or a line's end is put in quotes. NULL becomes an empty field, an empty text
/// becomes "". Bytes that are not UTF-8 become U+FFFD.
void AppendCsv(std::string& out, const ReportRow& row);

/// Appends the row as a JSON object with the names of CSV_HEADER, and a line feed. The id is a number. A
/// value that is an object or an array is written as JSON. All other members are strings or null. Bytes that
/// are not UTF-8 become U+FFFD.
void AppendJsonLine(std::string& out, const ReportRow& row);

} // namespace reportctl::store
