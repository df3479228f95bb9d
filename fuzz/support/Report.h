#pragma once

#include <algorithm>
#include <optional>
#include <string>

#include "Common/Records.h"
#include "SystemTool/IO/JsonDocument.h"

// What a report's text says, computed a second time in the simplest way. The targets compare it with what the
// service made of the report.

inline std::string MillisecondsOf(const SystemTool::IO::JsonDocument& createTime) {
    const std::string text = createTime.ToString(); // an integer prints as its digits
    return text.size() == 10 ? text + "000" : text;
}

/// The report's record; nothing for a text that is no JSON.
inline std::optional<SyncServiceReport::ST_OptLog> ReportIn(const std::string& datagram) {
    std::string error;
    SystemTool::IO::JsonDocument json;
    json.FromJson(datagram, error);
    if (!error.empty())
        return std::nullopt;
    SyncServiceReport::ST_OptLog report;
    report.eventID = json.GetKeyValue("eventID").ToString();
    report.value = json.GetKeyValue("value").ToString(); // an object's text is its JSON
    report.createTime = MillisecondsOf(json.GetKeyValue("createTime"));
    report.pType = std::ranges::count(report.eventID, '|') == 1 ? 0 : 1;
    return report;
}

inline bool IsEventReport(const std::string& datagram) {
    return datagram.find("eventID") != std::string::npos;
}

inline bool IsForAnalytics(const SyncServiceReport::ST_OptLog& report) {
    return report.eventID.starts_with("A");
}

inline std::string InsertOf(const SyncServiceReport::ST_OptLog& report,
                            const SyncServiceReport::ST_BaseInfo& info) {
    return "insert into OperLog (eventID,value,createTime,pType,extData3,extData4) values('" +
           report.eventID + "', '" + report.value + "','" + report.createTime + "'," +
           std::to_string(report.pType) + ",'" + info.suiteVersion + "','" + info.openID + "')";
}
