#pragma once

#include <array>
#include <atomic>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "EventRules.h"
#include "channel/Channel.h"
#include "hublink/report.hpp"

namespace hublink {

/// What a Reporter owns. Threads: any.
class Reporter::Inside {
public:
    Inside(const Module& module, const Options& options);

    Result Event(const GivenEvent& event) noexcept;
    Result SetUser(std::string_view openId, std::string_view suiteVersion) noexcept;

    /// Counts the result and returns it.
    Result Count(Result result) noexcept;
    std::uint64_t CountOf(Result result) const noexcept;

private:
    static constexpr std::size_t RESULTS = static_cast<std::size_t>(Result::SystemError) + 1;

    const std::string m_module; ///< The own module's id; empty when there is no own module.
    Channel m_channel;
    std::array<std::atomic<std::uint64_t>, RESULTS> m_counts{};
};

} // namespace hublink
