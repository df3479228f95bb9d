#pragma once

#include <algorithm>
#include <chrono>

/// The shortest time that `action` took in a few tries. A busy machine can only lengthen a try, so this is how a test asks
/// whether something is quick.
template <typename Action>
std::chrono::milliseconds Fastest(Action action) {
    auto fastest = std::chrono::milliseconds::max();
    for (int i = 0; i < 5; ++i) {
        const auto begin = std::chrono::steady_clock::now();
        action();
        const auto took = std::chrono::steady_clock::now() - begin;
        fastest = std::min(fastest, std::chrono::duration_cast<std::chrono::milliseconds>(took));
    }
    return fastest;
}
