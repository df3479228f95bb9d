#pragma once

#include <utility>

#include <unistd.h>

namespace SystemTool::IO {

/// Owns a file descriptor and closes it. To be used by one thread at a time.
class Descriptor {
public:
    Descriptor() = default;

    /// Takes over what open() returned; a negative number is no descriptor.
    explicit Descriptor(int number) : m_number(number) {}
    ~Descriptor() { Close(); }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    Descriptor(Descriptor&& other) noexcept : m_number(std::exchange(other.m_number, -1)) {}
    Descriptor& operator=(Descriptor&& other) noexcept {
        std::swap(m_number, other.m_number); // `other` now has our old descriptor, and closes it
        return *this;
    }

    bool IsOpen() const { return m_number >= 0; }
    int Number() const { return m_number; }

    void Close() {
        if (IsOpen())
            ::close(std::exchange(m_number, -1));
    }

private:
    int m_number = -1;
};

} // namespace SystemTool::IO
