#pragma once

#include <string_view>

#include "wire/Buffer.h"
#include "wire/Text.h"

// The texts that the service reads, and the one place that knows how they are written. They are written as
// they are asked for: what a text must be so that the service can use it is for the caller to know. All texts
// are valid (IsText).
namespace hublink::wire {

/// How a report's value is written.
enum class ValueForm {
    Nothing,  ///< There is none.
    Text,     ///< A text, as a JSON string.
    Json,     ///< JSON, as it is. The service reads it, and prints it again if it is an object.
    JsonText, ///< JSON, as the contents of a JSON string: a text, which the service leaves as it is.
};

struct Report {
    std::string_view eventId;
    ValueForm form = ValueForm::Nothing;
    std::string_view value;
    Quotes quotes = Quotes::AsTheyAre; ///< In the event id and the value.
    bool isCompact = false;      ///< The value is JSON without white space; false when that is not known.
    std::string_view createTime; ///< As JSON: a number, or a string.
    bool isDayReport = false;
};

void AppendReport(Buffer& buffer, const Report& report);

struct Announcement {
    std::string_view moduleId;
    std::string_view moduleVersion;
    std::string_view moduleName;
    std::string_view logPath;
    std::string_view dbPath; ///< Of the module's outbox; empty: the service's own.
    std::string_view openId; ///< Of the user who is signed in; empty: unchanged.
    std::string_view suiteVersion;
};

/// Announces an analytics module.
void AppendAnnouncement(Buffer& buffer, const Announcement& announcement);

/// Tells who is signed in. An empty version leaves the one that is known.
void AppendUser(Buffer& buffer, std::string_view openId, std::string_view suiteVersion);

} // namespace hublink::wire
