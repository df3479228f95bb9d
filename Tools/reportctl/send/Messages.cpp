#include "Tools/reportctl/send/Messages.h"

#include "Client/src/wire/Messages.h"
#include "SystemTool/IO/JsonDocument.h"
#include "SystemTool/Text/Utf8.h"

namespace reportctl::send {
namespace {

namespace wire = hublink::wire;
using SystemTool::IO::JsonDocument;
using SystemTool::Text::ValidUtf8;

/// The message that the client library writes with `append`. The buffer is large enough for any message; the
/// library itself uses one of a datagram's size. `bytes`: the length of all texts in the message.
template <typename Append>
std::string Written(std::size_t bytes, Append append) {
    constexpr std::size_t LONGEST_ESCAPE = 6; // one byte becomes at most six characters, as in \u0001
    constexpr std::size_t REST = 512;
    std::string room(bytes * LONGEST_ESCAPE + REST, '\0');
    wire::Buffer buffer(room.data(), room.size());
    append(buffer);
    return std::string(buffer.Text());
}

} // namespace

std::string BuildReport(const Report& report) {
    std::string error;
    const JsonDocument parsed = JsonDocument().FromJson(report.value, error);
    const std::string eventID = ValidUtf8(report.eventID);
    const std::string value = parsed.IsObject() ? parsed.ToJson() : ValidUtf8(report.value);
    const std::string time = std::to_string(report.createTime);
    wire::Report message;
    message.eventId = eventID;
    message.form = parsed.IsObject() ? wire::ValueForm::Json : wire::ValueForm::Text;
    message.value = value;
    message.createTime = time;
    message.isDayReport = report.isDayReport;
    return Written(eventID.size() + value.size(),
                   [&](wire::Buffer& buffer) { AppendReport(buffer, message); });
}

std::string BuildInit(const SyncServiceReport::ST_InitMsg& module) {
    SyncServiceReport::ST_InitMsg texts = module;
    std::size_t bytes = 0;
    for (auto* text : {&texts.moduleID, &texts.moduleVersion, &texts.moduleName, &texts.logPath,
                       &texts.dbPath, &texts.openID, &texts.hublinkVersion}) {
        *text = ValidUtf8(*text);
        bytes += text->size();
    }
    const wire::Announcement announcement{texts.moduleID,      texts.moduleVersion, texts.moduleName,
                                          texts.logPath,       texts.dbPath,        texts.openID,
                                          texts.hublinkVersion};
    return Written(bytes, [&](wire::Buffer& buffer) { AppendAnnouncement(buffer, announcement); });
}

std::string BuildOpenIdUpdate(const std::string& openID, const std::string& suiteVersion) {
    const std::string user = ValidUtf8(openID);
    const std::string version = ValidUtf8(suiteVersion);
    return Written(user.size() + version.size(),
                   [&](wire::Buffer& buffer) { AppendUser(buffer, user, version); });
}

} // namespace reportctl::send
