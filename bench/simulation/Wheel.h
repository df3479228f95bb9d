#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <utility>
#include <vector>

#include "bench/simulation/Config.h"

namespace Fleet {

/// What happens to which desktop.
struct Happening {
    Tick at;
    std::uint32_t desktop;
    std::uint32_t kind;
};

/// Gives out happenings in the order of their times. Those of one time come in the order in which they were
/// added. To add and to take one takes the same time for any number of them. A heap takes longer the more it
/// has, and a day of a million desktops has some 600 million.
///
/// The next 8 seconds have a list for each millisecond. Later happenings wait in a list for each 8 seconds.
class Wheel {
public:
    explicit Wheel(Tick end) : m_end(end), m_later(end / SPAN + 1) {}

    /// Ignores what is beyond the end.
    void Add(const Happening& happening) {
        if (happening.at >= m_end)
            return;
        if (happening.at / SPAN == m_now / SPAN)
            AddSoon(happening);
        else
            m_later[happening.at / SPAN].push_back(happening);
    }

    /// Calls `handle` for each, which may add others that are not earlier.
    template <typename Handle>
    void Run(Handle handle) {
        for (; m_now < m_end; ++m_now) {
            if (m_now % SPAN == 0)
                Refill();
            auto& now = m_soon[m_now % SPAN];
            for (std::size_t i = 0; i < now.size(); ++i)
                handle(Happening(now[i])); // a copy: the list may grow
            m_soonCount -= now.size();
            now.clear();
            if (m_soonCount == 0)
                m_now |= SPAN - 1; // skip to the next list of 8 seconds
        }
    }

private:
    static constexpr Tick SPAN = 8192;

    void Refill() {
        auto due = std::move(m_later[m_now / SPAN]);
        for (const auto& happening : due)
            AddSoon(happening);
    }

    void AddSoon(const Happening& happening) {
        m_soon[happening.at % SPAN].push_back(happening);
        ++m_soonCount;
    }

    Tick m_end;
    Tick m_now = 0;
    std::size_t m_soonCount = 0;
    std::array<std::vector<Happening>, SPAN> m_soon;
    std::vector<std::vector<Happening>> m_later; ///< By m_end / SPAN.
};

} // namespace Fleet
