#pragma once

#include <array>
#include <string_view>

#include "wire/Buffer.h"

namespace hublink::wire {

/// The memory for one datagram. It is put on the stack, so that each thread has its own without an
/// allocation.
// NOLINTNEXTLINE(cppcoreguidelines-pro-type-member-init): the bytes are written before they are read
class Datagram {
public:
    wire::Buffer& Buffer() { return m_buffer; }
    std::string_view Text() const { return m_buffer.Text(); }

private:
    std::array<char, MAX_DATAGRAM_BYTES> m_bytes;
    wire::Buffer m_buffer{m_bytes.data(), m_bytes.size()};
};

} // namespace hublink::wire
