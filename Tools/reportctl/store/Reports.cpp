#include "Tools/reportctl/store/Reports.h"

#include <fmt/format.h>

namespace reportctl::store {

std::string TimeOf(const std::string& createTime) {
    // The comparison asks whether the text is a number. SQLite compares the text with a cast number, and for
    // that it turns a well-formed text into a number. Any other text stays a text and equals no number.
    return fmt::format("case when {0} = cast({0} as numeric) and cast({0} as numeric) "
                       "between -62167219200000 and 253402300799999 then cast({0} as numeric) end",
                       createTime);
}

const std::string& ReportsSelect() {
    // json_valid reads a value up to its first zero byte only. So a value with such a byte does not count as
    // JSON, and neither does a blob: a report's text may put a blob into its row.
    static const std::string SELECT = fmt::format(R"sql(select id,
    strftime('%Y-%m-%dT%H:%M:%fZ', time / 1000.0, 'unixepoch') as at,
    strftime('%Y-%m-%dT%H:%M:%f', time / 1000.0, 'unixepoch', 'localtime') as at_local,
    eventID as event,
    case when instr(eventID, '|') then substr(eventID, 1, instr(eventID, '|') - 1) end as module,
    case when instr(eventID, '|') then substr(eventID, instr(eventID, '|') + 1) end as action,
    value,
    case when substr(ltrim(value, char(9, 10, 13, 32)), 1, 1) in ('{{', '[') and typeof(value) = 'text'
              and instr(value, char(0)) = 0 and json_valid(value) then value end as value_json,
    extData4 as openid,
    extData3 as suite_version,
    createTime as create_time,
    time
from (select *, {} as time from OperLog))sql",
                                                  TimeOf("createTime"));
    return SELECT;
}

const std::string& ReportsView() {
    static const std::string VIEW =
        "CREATE VIEW reports as select id, at, at_local, event, module, action, value, value_json, openid, "
        "suite_version from (" +
        ReportsSelect() + ")";
    return VIEW;
}

std::string ReportFilter::Condition() const {
    std::string condition = "1";
    if (sinceMs)
        condition += " and time >= :since";
    if (untilMs)
        condition += " and time < :until";
    if (!eventPrefix.empty())
        condition += " and substr(event, 1, length(:prefix)) = :prefix";
    return condition;
}

void ReportFilter::BindTo(SQLite::Statement& statement) const {
    if (sinceMs)
        statement.bind(":since", *sinceMs);
    if (untilMs)
        statement.bind(":until", *untilMs);
    if (!eventPrefix.empty())
        statement.bind(":prefix", eventPrefix);
}

} // namespace reportctl::store
