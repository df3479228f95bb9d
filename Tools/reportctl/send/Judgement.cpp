#include "Tools/reportctl/send/Judgement.h"

#include <algorithm>

#include <fmt/format.h>
#include <rapidjson/document.h>

#include "Common/ServiceConstants.h"
#include "Common/Wire.h"
#include "SystemTool/IO/JsonDocument.h"
#include "Tools/reportctl/message/Message.h"
#include "Tools/reportctl/store/SqlText.h"
#include "Tools/reportctl/terminal/Printable.h"

namespace reportctl::send {
namespace {

using SyncServiceReport::ORVEK_REPORT_MODULEINIT;
using SyncServiceReport::ORVEK_REPORT_UPDATEOPENID;
using SystemTool::IO::JsonDocument;

constexpr std::size_t DIGITS_OF_MILLISECONDS = 13;

bool Contains(const std::string& text, const std::string& part) {
    return text.find(part) != std::string::npos;
}

/// The words about a text that goes into the store's SQL: what happens when a character in it ends the SQL,
/// and what the sender can do about a quote.
struct InTheStore {
    const char* loss;
    const char* advice;
};

constexpr InTheStore OF_A_REPORT{"the database would reject the report", "Write the quote twice: ''"};

/// The user's texts go to analytics, too. There, a quote written twice stays two quotes.
constexpr InTheStore OF_THE_USER{"the database would reject every report while it is set",
                                 "Written twice it is stored as one quote, and goes to analytics as two"};

/// Judges a text that the service puts unchanged into its SQL.
void JudgeForStore(Judgement& judgement, const std::string& name, const std::string& text,
                   const InTheStore& words) {
    if (store::HasLoneQuote(text))
        judgement.errors.push_back(fmt::format("its {} holds a single quote. The service puts the text into "
                                               "its SQL as it is, and {}. {}",
                                               name, words.loss, words.advice));
    if (text.find('\0') != std::string::npos)
        judgement.errors.push_back(
            fmt::format("its {} holds a zero character (\\u0000). The service puts the "
                        "text into its SQL as it is, and {}",
                        name, words.loss));
}

bool IsNumber(const std::string& text) {
    return std::all_of(text.begin(), text.end(), [](char c) { return c >= '0' && c <= '9'; });
}

void JudgeTime(Judgement& judgement, const std::string& time) {
    if (time.empty())
        judgement.warnings.emplace_back("it has no createTime; the service keeps an empty one");
    else if (time.size() == Wire::SECONDS_LENGTH && !IsNumber(time))
        judgement.warnings.emplace_back(
            "its createTime has ten characters that are not ten digits; the service "
            "takes it for seconds and appends 000");
    else if (!IsNumber(time) ||
             (time.size() != Wire::SECONDS_LENGTH && time.size() != DIGITS_OF_MILLISECONDS))
        judgement.warnings.emplace_back("its createTime has neither ten digits (seconds since 1970) nor "
                                        "thirteen (milliseconds); the service keeps it as it is");
}

void JudgeAnalyticsValue(Judgement& judgement, const std::string& value) {
    if (value.empty())
        return;
    std::string error;
    const JsonDocument parsed = JsonDocument().FromJson(value, error);
    if (!error.empty())
        judgement.errors.push_back(fmt::format("its value must be empty or a JSON object for analytics, or "
                                               "the event is dropped; this one is not JSON: {}",
                                               error));
    else if (!parsed.IsObject() && parsed.ToJson() != "null") // null passes, like an empty value
        judgement.errors.emplace_back(
            "its value must be empty or a JSON object for analytics, or the event is "
            "dropped; this one is JSON of another kind");
}

void JudgeForAnalytics(Judgement& judgement, const std::string& eventID, const std::string& value) {
    if (!Contains(eventID, "|"))
        judgement.errors.emplace_back("its event id begins with \"A\", so it goes to analytics, which drops "
                                      "it: there is no bar in it to tell the module from the event. Write it "
                                      "like A100|10001");
    JudgeAnalyticsValue(judgement, value);
}

/// Only the letters of the name, in lower case. Two spellings of one name give the same result.
std::string Bare(std::string_view name) {
    std::string bare;
    for (const char c : name)
        if (c >= 'A' && c <= 'Z')
            bare += static_cast<char>(c - 'A' + 'a');
        else if (c >= 'a' && c <= 'z')
            bare += c;
    return bare;
}

using Names = std::vector<const char*>;

const Names NAMES{Wire::REPORT_MARK,   Wire::VALUE,        Wire::CREATE_TIME,
                  Wire::IS_DAY_REPORT, Wire::MESSAGE_KIND, Wire::MESSAGE_DATA};
const Names NAMES_IN_EXDATA{Wire::MODULE_ID, Wire::MODULE_VERSION, Wire::MODULE_NAME,    Wire::LOG_PATH,
                            Wire::DB_PATH,   Wire::OPEN_ID,        Wire::HUBLINK_VERSION};

/// Warns of a member whose name is almost one that the service reads: the service does not see it.
void JudgeMembers(Judgement& judgement, const rapidjson::Value& object, const Names& names,
                  const char* where) {
    for (const auto& member : object.GetObject()) {
        const std::string name(member.name.GetString(), member.name.GetStringLength());
        for (const auto* right : names)
            if (name != right && Bare(name) == Bare(right) && !object.HasMember(right))
                judgement.warnings.push_back(fmt::format(
                    "it has a member {}{}, which the service does not see: the name is \"{}\", to the letter",
                    terminal::Printable(name), where, right));
    }
}

void JudgeNames(Judgement& judgement, const std::string& text) {
    rapidjson::Document document;
    document.Parse<rapidjson::kParseIterativeFlag>(text.data(), text.size());
    if (!document.IsObject())
        return;
    JudgeMembers(judgement, document, NAMES, "");
    const auto exdata = document.FindMember(Wire::MESSAGE_DATA);
    if (exdata != document.MemberEnd() && exdata->value.IsObject() && !Contains(text, Wire::REPORT_MARK))
        JudgeMembers(judgement, exdata->value, NAMES_IN_EXDATA, " in its exdata");
}

void JudgeReport(Judgement& judgement, const JsonDocument& report) {
    const auto eventID = report.GetKeyValue(Wire::REPORT_MARK).ToString();
    const auto value = message::ValueText(report.GetKeyValue(Wire::VALUE));
    const auto time = report.GetKeyValue(Wire::CREATE_TIME).ToString();
    const bool isForAnalytics = eventID.starts_with(Wire::ANALYTICS_PREFIX);
    judgement.what = fmt::format("event {}, for {}", report.GetKeyValue(Wire::REPORT_MARK).ToJson(),
                                 isForAnalytics ? "analytics" : "the store");
    if (eventID.empty())
        judgement.errors.emplace_back(
            "it has no event id (no \"eventID\" at the top level, or an empty one): "
            "the service would store a report that belongs to no event");
    JudgeTime(judgement, time);
    if (eventID.starts_with("a") && Contains(eventID, "|"))
        judgement.warnings.emplace_back(
            "its event id begins with a small \"a\", so it goes to the store; those for "
            "analytics begin with \"A\"");
    if (isForAnalytics) {
        JudgeForAnalytics(judgement, eventID, value);
        return;
    }
    for (const auto& [name, text] : {std::pair{"event id", eventID}, {"value", value}, {"createTime", time}})
        JudgeForStore(judgement, name, text, OF_A_REPORT);
}

void JudgeUserText(Judgement& judgement, const std::string& name, const std::string& text) {
    JudgeForStore(judgement, name, text, OF_THE_USER);
    if (store::HasDoubledQuotes(text))
        judgement.warnings.push_back(fmt::format("its {} holds a single quote written twice: it is stored as "
                                                 "one quote, and goes to analytics as two",
                                                 name));
}

void JudgeUser(Judgement& judgement, const JsonDocument& exdata) {
    const auto openID = exdata.GetKeyValue(Wire::OPEN_ID).ToString();
    const auto version = exdata.GetKeyValue(Wire::HUBLINK_VERSION).ToString();
    if (openID.empty() && !version.empty())
        judgement.warnings.emplace_back("its hublinkVersion has no effect: the service takes a version over "
                                        "only together with an openID");
    if (openID.empty())
        return;
    JudgeUserText(judgement, "openID", openID);
    JudgeUserText(judgement, "hublinkVersion", version);
}

void JudgeInit(Judgement& judgement, const JsonDocument& exdata) {
    const auto module = exdata.GetKeyValue(Wire::MODULE_ID);
    const auto moduleID = module.ToString();
    judgement.what = fmt::format("init of module {}", module.ToJson());
    if (moduleID.empty())
        judgement.errors.emplace_back(
            "it has no moduleID in its exdata: no event could belong to the module");
    else if (!moduleID.starts_with(Wire::ANALYTICS_PREFIX) || Contains(moduleID, "|"))
        judgement.warnings.emplace_back(
            "no event will reach this module: only event ids that begin with \"A\" "
            "go to analytics, and their module is what stands before the bar");
    JudgeUser(judgement, exdata);
}

void JudgeOpenIdUpdate(Judgement& judgement, const JsonDocument& exdata) {
    const auto openID = exdata.GetKeyValue(Wire::OPEN_ID);
    judgement.what = fmt::format("updateOpenID to {}", openID.ToJson());
    if (openID.ToString().empty())
        judgement.errors.emplace_back("it has no openID in its exdata: the service would do nothing");
    else
        JudgeUser(judgement, exdata);
}

void JudgeControl(Judgement& judgement, const JsonDocument& message) {
    const auto msgType = message.GetKeyValue(Wire::MESSAGE_KIND);
    if (msgType.ToString() == ORVEK_REPORT_MODULEINIT)
        JudgeInit(judgement, message.GetKeyValue(Wire::MESSAGE_DATA));
    else if (msgType.ToString() == ORVEK_REPORT_UPDATEOPENID)
        JudgeOpenIdUpdate(judgement, message.GetKeyValue(Wire::MESSAGE_DATA));
    else
        judgement.errors.push_back(
            fmt::format("it is no report (there is no \"eventID\" in it) and no control message that the "
                        "service knows (its msgType is {}, and must be \"{}\" or \"{}\" to the letter): the "
                        "service would ignore it",
                        msgType.ToJson(), ORVEK_REPORT_MODULEINIT, ORVEK_REPORT_UPDATEOPENID));
}

bool IsControl(const JsonDocument& message) {
    const auto msgType = message.GetKeyValue(Wire::MESSAGE_KIND).ToString();
    return msgType == ORVEK_REPORT_MODULEINIT || msgType == ORVEK_REPORT_UPDATEOPENID;
}

void JudgeMessage(Judgement& judgement, const std::string& text, const JsonDocument& message) {
    // We search the raw text, because the service does so too, before it parses the text.
    if (!Contains(text, Wire::REPORT_MARK))
        JudgeControl(judgement, message);
    else if (IsControl(message))
        judgement.errors.emplace_back(
            "it is a control message with the text \"eventID\" somewhere in it, and "
            "the service takes every such text for a report. Where the text must "
            "be, spell it event\\u0049D");
    else
        JudgeReport(judgement, message);
}

std::string TooLong(std::uint64_t bytes) {
    return fmt::format("it has {} bytes, and the service cuts a text off after {}", bytes, Wire::MAX_BYTES);
}

/// The reason why the service cannot use the text at all; empty when it can.
std::string ReasonAgainstText(const std::string& text, JsonDocument& message) {
    if (text.size() > Wire::MAX_BYTES)
        return TooLong(text.size());
    if (const auto zero = text.find('\0'); zero != std::string::npos)
        return fmt::format("it holds a zero byte, and the service cuts a text off there: byte {}", zero);
    std::string error;
    message.FromJson(text, error);
    if (!error.empty())
        return fmt::format("it is not JSON: {}", error);
    if (!message.IsObject())
        return "it is JSON but no object: the service would find nothing in it";
    return {};
}

} // namespace

Judgement Judge(const std::string& text) {
    Judgement judgement;
    judgement.what = "a text";
    JsonDocument message;
    if (const auto reason = ReasonAgainstText(text, message); !reason.empty()) {
        judgement.errors.push_back(reason);
        return judgement;
    }
    if (Contains(text, "%"))
        judgement.warnings.emplace_back(
            "it holds a percent sign: the log may show a line with \"[BoostLogError]\" in "
            "place of it. It is processed all the same");
    JudgeNames(judgement, text);
    JudgeMessage(judgement, text, message);
    return judgement;
}

Judgement JudgeLonger(std::uint64_t bytes) {
    return {.what = "a text", .errors = {TooLong(bytes)}, .warnings = {}};
}

} // namespace reportctl::send
