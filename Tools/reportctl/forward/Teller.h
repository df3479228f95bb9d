#pragma once

#include <chrono>
#include <functional>
#include <string>

#include "Modules/MetrikSdk/Time.h"

namespace reportctl::forward {

/// Tells a person what goes wrong, and when it is over: the same cause again only when its text is another
/// one, or a minute later. One thread; the clock is the caller's.
class Teller {
public:
    using Write = std::function<void(const std::string& line)>;

    explicit Teller(Write write) : m_write(std::move(write)) {}

    /// What happened once.
    void Note(const std::string& text) const { m_write(text); }

    /// What lasts, such as a collector that is away.
    void Failure(const std::string& text, MetrikSdk::WallTime now);

    /// It is over; says so when it was told.
    void Over(const std::string& text);

private:
    Write m_write;
    std::string m_last; ///< Empty: all is well.
    MetrikSdk::WallTime m_toldAt{};
};

} // namespace reportctl::forward
