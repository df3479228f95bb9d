#include "EventRules.h"

#include <array>
#include <charconv>
#include <cstdint>

#include "wire/Json.h"
#include "wire/Messages.h"

namespace hublink {
namespace {

constexpr std::string_view DEFAULT_MODULE = "A759";

/// The most levels that a value may have. The service reads 128 levels, and the datagram's object around the
/// value is one of them.
constexpr std::size_t MAX_LEVELS = 127;

bool IsForAnalytics(std::string_view eventId) {
    return eventId.front() == 'A';
}

/// A time in milliseconds since 1970, as the service keeps it. The service takes every time of ten characters
/// for seconds. So a number of ten characters is written as a string with a zero in front: eleven characters.
class TimeText {
public:
    explicit TimeText(Reporter::Time time) {
        const std::int64_t ms =
            std::chrono::floor<std::chrono::milliseconds>(time.time_since_epoch()).count();
        char* const end = std::to_chars(m_text.data(), m_text.data() + m_text.size(), ms).ptr;
        m_length = static_cast<std::size_t>(end - m_text.data());
        if (m_length == LENGTH_OF_SECONDS)
            PutZeroInFront(ms);
    }

    std::string_view Json() const { return {m_text.data(), m_length}; }

private:
    static constexpr std::size_t LENGTH_OF_SECONDS = 10;

    void PutZeroInFront(std::int64_t ms) {
        char* at = m_text.data();
        for (const char c : ms < 0 ? std::string_view("\"-0") : std::string_view("\"0"))
            *at++ = c;
        at = std::to_chars(at, m_text.data() + m_text.size(), ms < 0 ? -ms : ms).ptr;
        *at++ = '"';
        m_length = static_cast<std::size_t>(at - m_text.data());
    }

    std::array<char, 24> m_text{}; // the longest number of 64 bits has 20 characters
    std::size_t m_length = 0;
};

/// How JSON for the store is written. The service reads an object and prints it again: an object goes as JSON
/// when that leaves it the same. All other JSON would be stored changed (for example numbers of more digits
/// than the service keeps, or deep nesting). It goes as a text, which the service does not change.
wire::ValueForm FormForStore(const wire::JsonFacts& facts) {
    return facts.isObject && facts.fate == wire::Fate::Exact && facts.levels <= MAX_LEVELS
               ? wire::ValueForm::Json
               : wire::ValueForm::JsonText;
}

bool IsFitForAnalytics(const wire::JsonFacts& facts) {
    return facts.isObject && facts.fate != wire::Fate::Lost && facts.levels <= MAX_LEVELS;
}

/// Puts the value into the report and decides in which form it is written. Returns Sent, or the reason why
/// the value cannot be sent.
Result TakeValue(wire::Report& report, const Value& value, bool isForAnalytics) {
    report.value = value.Text();
    if (value.WhatItIs() == Value::Kind::Nothing)
        return Result::Sent;
    if (!wire::IsText(report.value))
        return Result::InvalidText;
    if (value.WhatItIs() == Value::Kind::Text) {
        report.form = wire::ValueForm::Text;
        return isForAnalytics ? Result::InvalidJson : Result::Sent;
    }
    const wire::JsonFacts facts = wire::ReadJson(report.value);
    if (!facts.isJson)
        return facts.levels == wire::MAX_LEVELS ? Result::TooLong : Result::InvalidJson;
    report.isCompact = facts.isCompact;
    report.form = isForAnalytics ? wire::ValueForm::Json : FormForStore(facts);
    return isForAnalytics && !IsFitForAnalytics(facts) ? Result::InvalidJson : Result::Sent;
}

Result IsWritten(const wire::Buffer& buffer) {
    return buffer.IsTooShort() ? Result::TooLong : Result::Sent;
}

} // namespace

std::optional<std::string_view> ModuleOf(std::string_view eventId, std::string_view ownModule) {
    if (eventId.empty() || !wire::IsText(eventId))
        return std::nullopt;
    if (!IsForAnalytics(eventId))
        return std::string_view();
    const auto bar = eventId.find('|');
    if (bar == std::string_view::npos)
        return std::nullopt;
    const std::string_view module = eventId.substr(0, bar);
    return module == DEFAULT_MODULE || module == ownModule ? std::optional(module) : std::nullopt;
}

Result WriteEvent(wire::Buffer& buffer, const GivenEvent& event) {
    const TimeText time(event.time);
    wire::Report report;
    report.eventId = event.id;
    report.createTime = time.Json();
    report.isDayReport = event.isDayReport;
    const bool isForAnalytics = IsForAnalytics(event.id);
    report.quotes = isForAnalytics ? wire::Quotes::AsTheyAre : wire::Quotes::Doubled;
    const Result result = TakeValue(report, event.value, isForAnalytics);
    if (result != Result::Sent)
        return result;
    wire::AppendReport(buffer, report);
    return IsWritten(buffer);
}

Result WriteUser(wire::Buffer& buffer, std::string_view openId, std::string_view suiteVersion) {
    // The service ignores an empty open id.
    if (openId.empty() || !wire::IsText(openId) || !wire::IsText(suiteVersion))
        return Result::InvalidText;
    for (const auto text : {openId, suiteVersion})
        if (text.find('\'') != std::string_view::npos)
            return Result::QuoteInUser;
    wire::AppendUser(buffer, openId, suiteVersion);
    return IsWritten(buffer);
}

Result WriteAnnouncement(wire::Buffer& buffer, const Module& module) {
    wire::Announcement announcement;
    announcement.moduleId = module.id;
    announcement.moduleVersion = module.version;
    announcement.moduleName = module.name;
    for (const std::string_view text :
         {announcement.moduleId, announcement.moduleVersion, announcement.moduleName})
        if (!wire::IsText(text))
            return Result::InvalidText;
    wire::AppendAnnouncement(buffer, announcement);
    return IsWritten(buffer);
}

} // namespace hublink
