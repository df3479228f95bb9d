#include "wire/Messages.h"

#include <algorithm>

#include "wire/Json.h"

namespace hublink::wire {
namespace {

void AppendValue(Buffer& buffer, const Report& report) {
    switch (report.form) {
    case ValueForm::Nothing:
        return;
    case ValueForm::Text:
        buffer.Append(R"(,"value":")");
        AppendEscaped(buffer, report.value, report.quotes);
        return buffer.Append('"');
    case ValueForm::Json:
        buffer.Append(R"(,"value":)");
        return AppendJson(buffer, report.value, report.quotes, report.isCompact);
    case ValueForm::JsonText:
        buffer.Append(R"(,"value":")");
        AppendJsonEscaped(buffer, report.value, report.quotes);
        return buffer.Append('"');
    }
}

/// Appends the inside of a JSON string of a control message. The service takes every datagram with the
/// letters eventID in it for a report. So one of the letters is written as an escape, which a JSON reader
/// turns back into the letter.
void AppendMasked(Buffer& buffer, std::string_view text) {
    constexpr std::string_view MARK = "eventID";
    constexpr std::string_view MASKED = "event\\u0049D";
    while (!text.empty()) {
        const auto mark = std::min(text.find(MARK), text.size());
        AppendEscaped(buffer, text.substr(0, mark), Quotes::AsTheyAre);
        text.remove_prefix(mark);
        if (text.empty())
            return;
        buffer.Append(MASKED);
        text.remove_prefix(MARK.size());
    }
}

void AppendMember(Buffer& buffer, std::string_view begin, std::string_view text) {
    buffer.Append(begin);
    AppendMasked(buffer, text);
    buffer.Append('"');
}

} // namespace

void AppendReport(Buffer& buffer, const Report& report) {
    buffer.Append(R"({"eventID":")");
    AppendEscaped(buffer, report.eventId, report.quotes);
    buffer.Append('"');
    AppendValue(buffer, report);
    buffer.Append(R"(,"createTime":)");
    buffer.Append(report.createTime);
    buffer.Append(report.isDayReport ? R"(,"isDayReport":1})" : R"(,"isDayReport":0})");
}

void AppendAnnouncement(Buffer& buffer, const Announcement& announcement) {
    AppendMember(buffer, R"({"msgType":"init","exdata":{"moduleID":")", announcement.moduleId);
    AppendMember(buffer, R"(,"moduleVersion":")", announcement.moduleVersion);
    AppendMember(buffer, R"(,"moduleName":")", announcement.moduleName);
    AppendMember(buffer, R"(,"logPath":")", announcement.logPath);
    AppendMember(buffer, R"(,"dbPath":")", announcement.dbPath);
    AppendMember(buffer, R"(,"openID":")", announcement.openId);
    AppendMember(buffer, R"(,"hublinkVersion":")", announcement.suiteVersion);
    buffer.Append("}}");
}

void AppendUser(Buffer& buffer, std::string_view openId, std::string_view suiteVersion) {
    AppendMember(buffer, R"({"msgType":"updateOpenID","exdata":{"openID":")", openId);
    AppendMember(buffer, R"(,"hublinkVersion":")", suiteVersion);
    buffer.Append("}}");
}

} // namespace hublink::wire
