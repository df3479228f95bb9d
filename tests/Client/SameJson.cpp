#include "tests/Client/SameJson.h"

#include <string_view>
#include <utility>
#include <vector>

#include <rapidjson/reader.h>

namespace {

/// A number as its sign, its digits without zeros at both ends, and the power of ten: "-12e1" for -120.0.
std::string Decimal(std::string_view number) {
    const bool isNegative = number.front() == '-';
    number.remove_prefix(isNegative ? 1 : 0);
    const auto end = number.find_first_of("eE");
    std::string digits(number.substr(0, end));
    long long power = end == std::string_view::npos ? 0 : std::stoll(std::string(number.substr(end + 1)));
    if (const auto point = digits.find('.'); point != std::string::npos) {
        power -= static_cast<long long>(digits.size() - point - 1);
        digits.erase(point, 1);
    }
    digits.erase(0, digits.find_first_not_of('0'));
    for (; !digits.empty() && digits.back() == '0'; ++power)
        digits.pop_back();
    return (isNegative ? "-" : "") + digits + "e" + std::to_string(digits.empty() ? 0 : power);
}

/// Lists the parts of JSON in their order.
class Parts : public rapidjson::BaseReaderHandler<rapidjson::UTF8<>, Parts> {
public:
    using Size = rapidjson::SizeType;

    std::vector<std::string> parts;

    bool Null() { return Add("null"); }
    bool Bool(bool value) { return Add(value ? "true" : "false"); }
    bool RawNumber(const char* text, Size length, bool /*copy*/) { return Add(Decimal({text, length})); }
    bool String(const char* text, Size length, bool /*copy*/) { return Add('"' + std::string(text, length)); }
    bool Key(const char* text, Size length, bool /*copy*/) { return Add(':' + std::string(text, length)); }
    bool StartObject() { return Add("{"); }
    bool EndObject(Size /*members*/) { return Add("}"); }
    bool StartArray() { return Add("["); }
    bool EndArray(Size /*elements*/) { return Add("]"); }

private:
    bool Add(std::string part) {
        parts.push_back(std::move(part));
        return true;
    }
};

/// The parts of the JSON; none when it is no JSON.
std::vector<std::string> PartsOf(const std::string& json) {
    Parts parts;
    rapidjson::StringStream stream(json.c_str());
    rapidjson::Reader reader;
    const bool isJson = !reader.Parse<rapidjson::kParseNumbersAsStringsFlag>(stream, parts).IsError();
    return isJson ? parts.parts : std::vector<std::string>();
}

} // namespace

bool IsSameJson(const std::string& one, const std::string& other) {
    const auto parts = PartsOf(one);
    return !parts.empty() && parts == PartsOf(other);
}
