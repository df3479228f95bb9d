#pragma once

#include <cstdlib>
#include <iostream>
#include <string_view>

// How a target reports a finding: it ends the process, and the fuzzer keeps the input.

inline void Require(bool holds, std::string_view fact, std::string_view found = {}) {
    if (holds)
        return;
    std::cerr << "Does not hold: " << fact << "\nFound: " << found << std::endl;
    std::abort();
}

template <typename Actual, typename Expected>
void RequireEqual(const Actual& actual, const Expected& expected, std::string_view fact) {
    if (actual == expected)
        return;
    std::cerr << "Not equal: " << fact << "\nFound:    " << actual << "\nExpected: " << expected << std::endl;
    std::abort();
}
