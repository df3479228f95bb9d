#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace Fleet {

/// The lengths of request bodies. They are measured with the encoder and the compression of the service, on
/// events like those of docs/Events.md. Each event has values of its own.
class BodySizes {
public:
    BodySizes(std::uint64_t seed, std::size_t maxEvents);

    struct Size {
        std::size_t plain = 0;
        std::size_t sent = 0; ///< Compressed.
    };
    const Size& Of(std::size_t events) const { return m_sizes[events]; }

    /// The bytes that the outbox counts for one event.
    std::size_t EventBytes() const { return m_eventBytes; }

private:
    std::vector<Size> m_sizes; ///< By the number of events; interpolated between measured ones.
    std::size_t m_eventBytes = 0;
};

} // namespace Fleet
