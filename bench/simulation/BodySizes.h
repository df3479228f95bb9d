#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace Fleet {

/// How long requests are: measured with the encoder and the compression that the service uses, on events like
/// those of docs/Events.md, each with other values.
class BodySizes {
public:
    BodySizes(std::uint64_t seed, std::size_t maxEvents);

    struct Size {
        std::size_t plain = 0;
        std::size_t sent = 0; ///< Compressed.
    };
    const Size& Of(std::size_t events) const { return m_sizes[events]; }

    /// Of one event, as the outbox counts it.
    std::size_t EventBytes() const { return m_eventBytes; }

private:
    std::vector<Size> m_sizes; ///< By the number of events; between those measured, along a straight line.
    std::size_t m_eventBytes = 0;
};

} // namespace Fleet
