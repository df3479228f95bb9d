#include "Modules/MetrikSdk/otlp/Secrets.h"

#include <algorithm>
#include <string_view>
#include <utility>

#include "Modules/MetrikSdk/otlp/VariableText.h"

namespace MetrikSdk::otlp {
namespace {

constexpr std::string_view HIDDEN = "(secret)";

/// A shorter value is no credential, and could be a part of any word or number.
constexpr std::size_t MIN_BYTES = 4;

constexpr std::string_view ENDS_OF_AN_ADDRESS = " \t\r\n\"'<>";

void ReplaceAll(std::string& text, const std::string& secret) {
    for (auto at = text.find(secret); at != std::string::npos; at = text.find(secret, at + HIDDEN.size()))
        text.replace(at, secret.size(), HIDDEN);
}

/// Some programs write a slash in JSON as "\/".
std::string WithEscapedSlashes(const std::string& text) {
    std::string escaped;
    for (const char c : text)
        escaped += c == '/' ? "\\/" : std::string(1, c);
    return escaped;
}

/// Hides what is between `start` and the last '@' before the end of the address. Returns where to go on.
std::size_t HideUser(std::string& text, std::size_t start) {
    const auto end = std::min(text.find_first_of(ENDS_OF_AN_ADDRESS, start), text.size());
    const auto at = std::string_view(text).substr(0, end).rfind('@');
    if (at == std::string_view::npos || at <= start)
        return end;
    text.replace(start, at - start, HIDDEN);
    return end - (at - start) + HIDDEN.size();
}

void HideUsersOfAddresses(std::string& text) {
    for (auto at = text.find("//"); at != std::string::npos; at = text.find("//", at))
        at = HideUser(text, at + 2);
}

} // namespace

Secrets::Secrets(const std::vector<std::pair<std::string, std::string>>& headers) {
    const auto add = [this](const std::string& value) {
        if (value.size() < MIN_BYTES)
            return;
        m_values.push_back(value);
        if (value.find('/') != std::string::npos)
            m_values.push_back(WithEscapedSlashes(value));
    };
    for (const auto& [name, value] : headers) {
        add(value);
        for (const std::string scheme : {"bearer ", "basic "})
            if (LowerCase(value).starts_with(scheme))
                add(Trimmed(value.substr(scheme.size())));
    }
    std::stable_sort(m_values.begin(), m_values.end(),
                     [](const auto& left, const auto& right) { return left.size() > right.size(); });
}

std::string Secrets::WithoutValues(std::string text) const {
    for (const auto& value : m_values)
        ReplaceAll(text, value);
    return text;
}

std::string Secrets::WithoutThem(std::string answer) const {
    auto text = WithoutValues(std::move(answer));
    HideUsersOfAddresses(text);
    return text;
}

std::string Secrets::WithoutThemInFault(std::string fault) const {
    auto text = WithoutThem(std::move(fault));
    for (std::size_t word = 0; word < text.size();) {
        const auto end = std::min(text.find_first_of(ENDS_OF_AN_ADDRESS, word), text.size());
        const auto scheme = text.find("//", word);
        word = 1 + HideUser(text, scheme < end ? scheme + 2 : word);
    }
    return text;
}

} // namespace MetrikSdk::otlp
