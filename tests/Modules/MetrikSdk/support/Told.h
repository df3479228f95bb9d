#pragma once

#include <algorithm>
#include <mutex>
#include <string>
#include <vector>

/// The texts that the callbacks got. Callbacks are plain functions, so a test program has one list of
/// failures and one of successes.
class Told {
public:
    static Told& Failures() {
        static Told told;
        return told;
    }
    static Told& Successes() {
        static Told told;
        return told;
    }
    static void OnFailure(std::string what, std::string why) { Failures().Add(what + ": " + why); }
    static void OnSuccess(std::string what, std::string detail) { Successes().Add(what + ": " + detail); }
    static void Forget() {
        Failures().Clear();
        Successes().Clear();
    }

    std::vector<std::string> All() const {
        const std::lock_guard lock(m_mutex);
        return m_texts;
    }

    /// How many of the texts begin with `start`.
    std::ptrdiff_t Count(const std::string& start) const {
        const auto all = All();
        return std::count_if(all.begin(), all.end(),
                             [&](const auto& text) { return text.starts_with(start); });
    }

private:
    void Add(std::string text) {
        const std::lock_guard lock(m_mutex);
        m_texts.push_back(std::move(text));
    }
    void Clear() {
        const std::lock_guard lock(m_mutex);
        m_texts.clear();
    }

    mutable std::mutex m_mutex;
    std::vector<std::string> m_texts;
};
