#include "Modules/MetrikSdk/outbox/Uuid.h"

#include <cstdint>
#include <mutex>
#include <random>

namespace MetrikSdk::outbox {
namespace {

/// The 12 bits after the version. They start in the lower half of their range, so the upper half is left for
/// counting up within a millisecond.
constexpr unsigned COUNTER_BITS = 12;
constexpr std::uint64_t COUNTER_START_MASK = 0x7ff;

class Generator {
public:
    Generator() { // NOLINT(cert-msc32-c,cert-msc51-cpp): seeded below, before the first use
        std::random_device entropy;
        std::seed_seq seed{entropy(), entropy(), entropy(), entropy()};
        m_random.seed(seed);
    }

    struct Bits {
        std::uint64_t high;
        std::uint64_t low;
    };

    Bits Next(std::uint64_t milliseconds) {
        const std::lock_guard lock(m_mutex);
        // Time and counter are one number that only grows. When the counter overflows, the time grows by a
        // millisecond.
        const auto fresh = (milliseconds << COUNTER_BITS) | (m_random() & COUNTER_START_MASK);
        m_last = (fresh >> COUNTER_BITS) > (m_last >> COUNTER_BITS) ? fresh : m_last + 1;
        const auto time = m_last >> COUNTER_BITS;
        const auto counter = m_last & 0xfff;
        return {(time << 16) | 0x7000 | counter, (m_random() >> 2) | 0x8000'0000'0000'0000};
    }

private:
    std::mutex m_mutex; ///< Guards all below.
    std::mt19937_64 m_random;
    std::uint64_t m_last = 0;
};

void AppendHex(std::string& text, std::uint64_t bits, int digits) {
    for (int shift = (digits - 1) * 4; shift >= 0; shift -= 4)
        text += "0123456789abcdef"[(bits >> shift) & 0xf];
}

} // namespace

std::string NewUuid(WallTime now) {
    // Never destroyed: events may still come while the process is in exit().
    static auto& generator = *new Generator;
    const auto bits = generator.Next(static_cast<std::uint64_t>(now.time_since_epoch().count()));
    std::string text;
    text.reserve(36);
    AppendHex(text, bits.high >> 32, 8);
    text += '-';
    AppendHex(text, bits.high >> 16, 4);
    text += '-';
    AppendHex(text, bits.high, 4);
    text += '-';
    AppendHex(text, bits.low >> 48, 4);
    text += '-';
    AppendHex(text, bits.low, 12);
    return text;
}

} // namespace MetrikSdk::outbox
