#include "Tools/reportctl/bundle/Redaction.h"

#include <algorithm>

#include <fmt/format.h>

#include "Common/Wire.h"
#include "SystemTool/IO/JsonDocument.h"
#include "Tools/reportctl/log/Line.h"
#include "Tools/reportctl/message/Message.h"
#include "Tools/reportctl/terminal/Printable.h"

namespace reportctl::bundle {
namespace {

using SystemTool::IO::JsonDocument;

std::string Sizes(std::string_view what, std::size_t bytes) {
    return fmt::format("[{}, {} bytes]", what, bytes);
}

/// Replaces each quoted piece of the text by "...". A database's error quotes a piece of the statement, which
/// may be a piece of a report's value.
std::string WithoutQuoted(const std::string& text) {
    std::string out;
    bool isInside = false;
    for (const char c : text) {
        if (c == '"' && !isInside)
            out += "\"...";
        if (c == '"') {
            isInside = !isInside;
            out += isInside ? "" : "\"";
        } else if (!isInside || c == '\n') {
            out += c;
        }
    }
    return out;
}

/// Takes the statements of reports out of a text. Any file of the bundle may quote the log's last error, and
/// that error may hold the statement of a report that the store refused.
std::string WithoutStatements(const std::string& text) {
    std::string out;
    for (std::size_t begin = 0; begin < text.size();) {
        const auto end = std::min(text.find('\n', begin), text.size() - 1) + 1;
        const auto line = text.substr(begin, end - begin);
        const auto sql = line.find("insert into OperLog");
        const bool hasPiece =
            line.find("near \"") != std::string::npos; // the line may have been cut before the statement
        if (sql != std::string::npos)
            out += WithoutQuoted(line.substr(0, sql)) + "[statement]\n";
        else
            out += hasPiece ? WithoutQuoted(line) : line;
        begin = end;
    }
    return out;
}

std::string RedactedControl(const message::Message& message, const JsonDocument& data) {
    JsonDocument kept;
    for (const auto* name : {Wire::MODULE_ID, Wire::MODULE_VERSION, Wire::MODULE_NAME, Wire::HUBLINK_VERSION,
                             Wire::LOG_PATH, Wire::DB_PATH})
        if (const auto text = data.GetKeyValue(name).ToString(); !text.empty())
            kept.SetKeyValue(name, text);
    if (const auto openID = data.GetKeyValue(Wire::OPEN_ID).ToString(); !openID.empty())
        kept.SetKeyValue(Wire::OPEN_ID, Sizes("open id", openID.size()));
    JsonDocument redacted;
    redacted.SetKeyValue(Wire::MESSAGE_KIND, message.control);
    redacted.SetKeyValue(Wire::MESSAGE_DATA, kept);
    return redacted.ToJson();
}

/// A time is left as it is when it is a number. A sender may put any other text there.
std::string RedactedTime(const std::string& time) {
    return time.find_first_not_of("0123456789") == std::string::npos ? time
                                                                     : Sizes("createTime", time.size());
}

std::string RedactedReport(const message::Message& message) {
    JsonDocument redacted;
    redacted.SetKeyValue(Wire::REPORT_MARK, message.eventID);
    redacted.SetKeyValue(Wire::VALUE, Sizes("value", message.value.size()));
    redacted.SetKeyValue(Wire::CREATE_TIME, RedactedTime(message.createTime));
    return redacted.ToJson();
}

/// A record's message without personal data. The place in the service that logged it tells what it may hold.
std::string Redacted(const log::Line& line) {
    if (line.site == "App/ReportServer" && line.function == "Recv")
        return line.message.starts_with("[BoostLogError]") ? line.message : RedactedDatagram(line.message);
    if (line.site == "App/ReportServer" && line.function == "SetBaseInfo")
        return "SetBaseInfo [open id and version]";
    if (line.site == "Frame/DBHelper") {
        const auto sql = line.message.find("-insert ");
        return WithoutQuoted(line.message.substr(0, sql)) + (sql == std::string::npos ? "" : "-[statement]");
    }
    return line.message;
}

} // namespace

std::string RedactedDatagram(const std::string& text) {
    const auto message = message::Read(text);
    if (!message.fault.empty())
        return Sizes("a text that is no JSON", text.size());
    if (message.kind != message::Kind::Control)
        return RedactedReport(message);
    std::string ignored;
    return RedactedControl(message, JsonDocument().FromJson(text, ignored).GetKeyValue(Wire::MESSAGE_DATA));
}

std::string Redaction::OfLogLine(const std::string& text) const {
    if (m_withValues)
        return text;
    const auto line = log::ReadLine(text);
    if (!line)
        return Sizes("half a line", text.size());
    const auto begin = text.find("] ", text.find("] [") + 2) + 2; // where the message begins
    return OfText(text.substr(0, begin) + terminal::Printable(Redacted(*line)));
}

std::string Redaction::OfText(std::string text) const {
    if (m_withValues)
        return text;
    text = WithoutStatements(text);
    if (m_home.size() < 2)
        return text;
    for (auto at = text.find(m_home); at != std::string::npos; at = text.find(m_home, at + 1))
        text.replace(at, m_home.size(), "~");
    return text;
}

} // namespace reportctl::bundle
