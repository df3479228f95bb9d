#include "Tools/reportctl/send/Messages.h"

#include <string_view>

#include "Common/ServiceConstants.h"
#include "Common/Wire.h"
#include "SystemTool/IO/JsonDocument.h"

namespace reportctl::send {
namespace {

using SystemTool::IO::JsonDocument;

JsonDocument Number(std::int64_t number) {
    std::string error;
    return JsonDocument().FromJson(std::to_string(number), error);
}

void SetValue(JsonDocument& report, const std::string& value) {
    std::string error;
    const JsonDocument parsed = JsonDocument().FromJson(value, error);
    if (parsed.IsObject())
        report.SetKeyValue("value", parsed);
    else
        report.SetKeyValue("value", value);
}

/// The service takes any text with these letters in it for a report. Escaped, they read the same.
std::string WithoutTheMarkOfReports(std::string text) {
    constexpr std::string_view MARK = Wire::REPORT_MARK;
    for (auto at = text.find(MARK); at != std::string::npos; at = text.find(MARK, at))
        text.replace(at, MARK.size(), "event\\u0049D");
    return text;
}

std::string BuildControl(const std::string& msgType, const JsonDocument& exdata) {
    JsonDocument message;
    message.SetKeyValue(Wire::MESSAGE_KIND, msgType);
    message.SetKeyValue(Wire::MESSAGE_DATA, exdata);
    return WithoutTheMarkOfReports(message.ToJson());
}

} // namespace

std::string BuildReport(const Report& report) {
    JsonDocument message;
    message.SetKeyValue(Wire::REPORT_MARK, report.eventID);
    SetValue(message, report.value);
    message.SetKeyValue("createTime", Number(report.createTime));
    message.SetKeyValue("isDayReport", Number(report.isDayReport ? 1 : 0));
    return message.ToJson();
}

std::string BuildInit(const SyncServiceReport::ST_InitMsg& module) {
    JsonDocument exdata;
    exdata.SetKeyValue("moduleID", module.moduleID);
    exdata.SetKeyValue("moduleVersion", module.moduleVersion);
    exdata.SetKeyValue("moduleName", module.moduleName);
    exdata.SetKeyValue("logPath", module.logPath);
    exdata.SetKeyValue("dbPath", module.dbPath);
    exdata.SetKeyValue("openID", module.openID);
    exdata.SetKeyValue("hublinkVersion", module.hublinkVersion);
    return BuildControl(SyncServiceReport::ORVEK_REPORT_MODULEINIT, exdata);
}

std::string BuildOpenIdUpdate(const std::string& openID, const std::string& suiteVersion) {
    JsonDocument exdata;
    exdata.SetKeyValue("openID", openID);
    exdata.SetKeyValue("hublinkVersion", suiteVersion);
    return BuildControl(SyncServiceReport::ORVEK_REPORT_UPDATEOPENID, exdata);
}

} // namespace reportctl::send
