#pragma once

#include <algorithm>
#include <chrono>

/// The shortest time that `action` took in a few tries. A busy machine can only make a try longer, so the
/// shortest one shows whether something is quick.
template <typename Action>
std::chrono::milliseconds Fastest(Action action, int tries = 5) {
    auto fastest = std::chrono::milliseconds::max();
    for (int i = 0; i < tries; ++i) {
        const auto begin = std::chrono::steady_clock::now();
        action();
        const auto took = std::chrono::steady_clock::now() - begin;
        fastest = std::min(fastest, std::chrono::duration_cast<std::chrono::milliseconds>(took));
    }
    return fastest;
}

/// Like Fastest, for an action that needs preparation: each try prepares without timing, and then times the
/// action. True as soon as one try stays under the limit.
template <typename Prepare, typename Action>
bool CanEndWithin(std::chrono::milliseconds limit, Prepare prepare, Action action) {
    for (int i = 0; i < 5; ++i) {
        prepare();
        if (Fastest(action, 1) < limit)
            return true;
    }
    return false;
}
