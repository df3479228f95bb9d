#include "Tools/reportctl/message/Message.h"

#include "Common/ServiceConstants.h"
#include "Common/Wire.h"

namespace reportctl::message {
namespace {

using SystemTool::IO::JsonDocument;

/// The time in milliseconds. Like the service, it takes every time of ten characters for seconds.
std::string TimeText(const JsonDocument& createTime) {
    auto text = createTime.ToString();
    return text.size() == Wire::SECONDS_LENGTH ? text + "000" : text;
}

void ReadReport(Message& message, const JsonDocument& report) {
    message.eventID = report.GetKeyValue(Wire::REPORT_MARK).ToString();
    message.value = ValueText(report.GetKeyValue(Wire::VALUE));
    message.createTime = TimeText(report.GetKeyValue(Wire::CREATE_TIME));
    message.kind = message.eventID.starts_with(Wire::ANALYTICS_PREFIX) ? Kind::Event : Kind::Report;
    if (const auto bar = message.eventID.find('|'); bar != std::string::npos)
        message.module = message.eventID.substr(0, bar);
}

} // namespace

const char* WordFor(Kind kind) {
    switch (kind) {
    case Kind::Report:
        return "report";
    case Kind::Event:
        return "event";
    case Kind::Control:
        return "control";
    default:
        return "other";
    }
}

std::string ValueText(const JsonDocument& value) {
    return value.IsObject() ? value.ToJson() : value.ToString();
}

Message Read(const std::string& text) {
    Message message;
    JsonDocument document;
    document.FromJson(text, message.fault);
    // We search the raw text, because the service does so too, before it parses the text.
    if (text.find(Wire::REPORT_MARK) != std::string::npos) {
        ReadReport(message, document);
        return message;
    }
    message.kind = Kind::Control;
    message.control = document.GetKeyValue(Wire::MESSAGE_KIND).ToString();
    const auto data = document.GetKeyValue(Wire::MESSAGE_DATA);
    message.module = data.GetKeyValue(Wire::MODULE_ID).ToString();
    if (message.control == SyncServiceReport::ORVEK_REPORT_MODULEINIT)
        message.directory = data.GetKeyValue(Wire::DB_PATH).ToString();
    return message;
}

} // namespace reportctl::message
