#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "Common/Wire.h"

inline std::string TextOf(const std::uint8_t* data, std::size_t size) {
    return {reinterpret_cast<const char*>(data), size};
}

/// The datagrams of an input: one, or several with a zero byte after each, which no datagram's text can
/// contain. They are cut as the receiver cuts them. Empty ones are left out.
inline std::vector<std::string> DatagramsOf(const std::uint8_t* data, std::size_t size) {
    const std::string input = TextOf(data, size);
    std::vector<std::string> datagrams;
    for (std::size_t at = 0; at < input.size();) {
        const std::size_t end = std::min(input.find('\0', at), input.size());
        if (end > at)
            datagrams.push_back(input.substr(at, std::min(end - at, Wire::MAX_BYTES)));
        at = end + 1;
    }
    return datagrams;
}
