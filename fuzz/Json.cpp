// A text through the JSON reader. A text that can be read must print as the same value, number by number, and
// a member that was set must be found.

#include <charconv>
#include <cmath>
#include <cstring>
#include <vector>

#include "SystemTool/IO/JsonDocument.h"
#include "fuzz/support/Input.h"
#include "fuzz/support/Require.h"

using SystemTool::IO::JsonDocument;

namespace {

JsonDocument Parsed(const std::string& text, std::string& error) {
    JsonDocument document;
    error = "left over";
    const JsonDocument returned = document.FromJson(text, error);
    RequireEqual(returned.ToJson(), document.ToJson(), "what is returned is what is kept");
    return document;
}

JsonDocument Readable(const std::string& text) {
    std::string error;
    const JsonDocument document = Parsed(text, error);
    RequireEqual(error, "", "what was printed can be read: " + text);
    return document;
}

/// The numbers of a JSON text, in order, as they are written there.
std::vector<std::string> NumbersIn(const std::string& json) {
    std::vector<std::string> numbers;
    for (std::size_t at = 0; at < json.size(); ++at) {
        if (json[at] == '"') {
            while (json[++at] != '"')
                at += json[at] == '\\' ? 1 : 0;
        } else if (json[at] == '-' || (json[at] >= '0' && json[at] <= '9')) {
            const auto end = std::min(json.find_first_not_of("+-.0123456789eE", at), json.size());
            numbers.push_back(json.substr(at, end - at));
            at = end - 1;
        }
    }
    return numbers;
}

template <typename Integer>
bool Fits(const std::string& digits) {
    Integer ignored{};
    const auto result = std::from_chars(digits.data(), digits.data() + digits.size(), ignored);
    return result.ec == std::errc() && result.ptr == digits.data() + digits.size();
}

void RequireSameNumbers(const std::string& written, const std::string& printed) {
    const auto before = NumbersIn(written);
    const auto after = NumbersIn(printed);
    RequireEqual(after.size(), before.size(), "as many numbers are printed as were read");
    for (std::size_t i = 0; i < before.size(); ++i) {
        const bool isInteger = Fits<std::int64_t>(before[i]) || Fits<std::uint64_t>(before[i]);
        if (isInteger && before[i] != "-0")
            RequireEqual(after[i], before[i], "an integer of 64 bits keeps every digit");
        else
            RequireEqual(std::strtod(after[i].c_str(), nullptr), std::strtod(before[i].c_str(), nullptr),
                         "a number keeps its value: " + before[i]);
    }
}

void RequireConsistentAccessors(const JsonDocument& document) {
    const std::string json = document.ToJson();
    RequireEqual(document.IsObject(), json.starts_with('{'), "an object is what prints as one");
    RequireEqual(document.IsLongLong(), Fits<std::int64_t>(json), "an integer is what prints as one");
    if (document.IsLongLong())
        RequireEqual(std::to_string(document.ToLongLong()), json, "an integer's value is its text");
    else
        RequireEqual(document.ToLongLong(), 0, "what is no integer is 0");
    const auto integer = document.ToLongLong();
    RequireEqual(document.ToInt(), Fits<int>(json) ? integer : 0, "an int is an integer that fits one");
    const std::string text = document.ToString();
    if (json == "null")
        RequireEqual(text, "", "null is an empty text");
    else if (!json.starts_with('"'))
        RequireEqual(text, json, "what is no string is its JSON");
}

void RequireStringSurvives(const JsonDocument& document) {
    JsonDocument holder;
    holder.SetKeyValue("text", document.ToString());
    RequireEqual(Readable(holder.ToJson()).GetKeyValue("text").ToString(), document.ToString(),
                 "a text that was read survives being set, printed and read");
}

/// Sets members in a copy of an object, and requires that the original does not change.
void RequireMembersCanBeSet(const JsonDocument& document, const std::string& json) {
    JsonDocument copy = document;
    copy.SetKeyValue("value", document);
    copy.SetKeyValue("eventID", "set");
    RequireEqual(document.ToJson(), json, "the original does not change with a copy");
    RequireEqual(copy.GetKeyValue("value").ToJson(), json, "a member that was set can be got");
    RequireEqual(copy.GetKeyValue("eventID").ToString(), "set", "and so can another");
    JsonDocument list;
    list.SetKeyValue("copy", copy);
    RequireEqual(list.GetKeyValue("copy").ToJson(), copy.ToJson(), "an object within another is the same");
}

/// Sets a text of any bytes, and requires that the document prints as JSON.
void RequireAnyTextCanBeSet(const std::string& bytes) {
    JsonDocument document;
    document.SetKeyValue(bytes, bytes);
    const JsonDocument again = Readable(document.ToJson());
    RequireEqual(again.ToJson(), document.ToJson(), "any text can be set, printed and read");
}

/// Requires that a number which was refused as too big really is.
void RequireTooBig(const std::string& text, const std::string& error) {
    const std::string refusal = "Number too big to be stored in double. At byte ";
    if (!error.starts_with(refusal))
        return;
    const auto at = static_cast<std::size_t>(std::stoul(error.substr(refusal.size())));
    Require(std::isinf(std::strtod(text.c_str() + at, nullptr)), "what is refused as too big is so", error);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text = TextOf(data, size);
    RequireAnyTextCanBeSet(text);
    std::string error;
    const JsonDocument document = Parsed(text, error);
    const std::string json = document.ToJson();
    if (!error.empty()) {
        RequireEqual(json, "null", "what cannot be read is null");
        RequireTooBig(text, error);
        return 0;
    }
    RequireEqual(Readable(json).ToJson(), json, "what was printed prints the same again");
    RequireSameNumbers(text, json);
    RequireConsistentAccessors(document);
    RequireStringSurvives(document);
    for (const auto* key : {"eventID", "value", "createTime", "isDayReport", "msgType", "exdata", "", "a"})
        RequireConsistentAccessors(document.GetKeyValue(key));
    if (document.IsObject())
        RequireMembersCanBeSet(document, json);
    return 0;
}
