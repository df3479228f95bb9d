#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

inline std::string TextOf(const std::uint8_t* data, std::size_t size) {
    return {reinterpret_cast<const char*>(data), size};
}

/// The datagrams of an input: one, or several with a zero byte behind each, which no datagram's text can hold. Cut as the
/// receiver cuts them; empty ones are left out.
inline std::vector<std::string> DatagramsOf(const std::uint8_t* data, std::size_t size) {
    constexpr std::size_t RECEIVE_BUFFER_BYTES = 10240;
    const std::string input = TextOf(data, size);
    std::vector<std::string> datagrams;
    for (std::size_t at = 0; at < input.size();) {
        const std::size_t end = std::min(input.find('\0', at), input.size());
        if (end > at)
            datagrams.push_back(input.substr(at, std::min(end - at, RECEIVE_BUFFER_BYTES)));
        at = end + 1;
    }
    return datagrams;
}
