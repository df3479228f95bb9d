#pragma once

#include <algorithm>
#include <memory>
#include <string>

#include "Modules/MetrikSdk/otlp/CurlLibrary.h"

// How the values of OTEL_* variables are read.
namespace MetrikSdk::otlp {

inline std::string Trimmed(const std::string& text) {
    const auto first = text.find_first_not_of(" \t");
    if (first == std::string::npos)
        return {};
    return text.substr(first, text.find_last_not_of(" \t") - first + 1);
}

inline std::string LowerCase(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(c >= 'A' && c <= 'Z' ? c + 32 : c); });
    return text;
}

inline std::string PercentDecoded(const std::string& text) {
    int length = 0;
    const std::unique_ptr<char, decltype(&::curl_free)> decoded(
        Curl().easy_unescape(nullptr, text.c_str(), static_cast<int>(text.size()), &length), Curl().free);
    return decoded ? std::string(decoded.get(), static_cast<std::size_t>(length)) : std::string();
}

} // namespace MetrikSdk::otlp
