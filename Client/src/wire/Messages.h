#pragma once

#include <string_view>

#include "wire/Buffer.h"
#include "wire/Text.h"

// Writes the messages that the service reads. No other place knows how they are written. The functions check
// nothing: the caller must know which texts the service can use. Every text must be valid (IsText).
namespace hublink::wire {

/// How a report's value is written.
enum class ValueForm {
    Nothing,  ///< There is no value.
    Text,     ///< A text, as a JSON string.
    Json,     ///< JSON, as it is. The service reads it; an object is printed again.
    JsonText, ///< JSON, as the contents of a JSON string. The service does not change it.
};

struct Report {
    std::string_view eventId;
    ValueForm form = ValueForm::Nothing;
    std::string_view value;
    Quotes quotes = Quotes::AsTheyAre; ///< How quotes in the event id and in the value are written.
    bool isCompact = false;      ///< The value is JSON without white space; false when that is not known.
    std::string_view createTime; ///< Written as JSON: a number, or a string with its quotation marks.
    bool isDayReport = false;
};

void AppendReport(Buffer& buffer, const Report& report);

struct Announcement {
    std::string_view moduleId;
    std::string_view moduleVersion;
    std::string_view moduleName;
    std::string_view logPath;
    std::string_view dbPath; ///< The directory of the module's outbox; when empty, the service chooses one.
    std::string_view openId; ///< The signed-in user's; when empty, the service keeps the user it knows.
    std::string_view suiteVersion;
};

/// Announces an analytics module.
void AppendAnnouncement(Buffer& buffer, const Announcement& announcement);

/// Tells who is signed in. With an empty version, the service keeps the version that it knows.
void AppendUser(Buffer& buffer, std::string_view openId, std::string_view suiteVersion);

} // namespace hublink::wire
