#pragma once

#include <chrono>
#include <cstdint>
#include <string>

namespace reportctl::terminal {

/// A line on standard error that tells how far a long command is. It is shown on a terminal only, and it is
/// gone when this object is: what the command has to say at its end stands alone.
class Progress {
public:
    /// `label` says what is being done, such as "exporting".
    explicit Progress(std::string label);
    ~Progress();
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;

    /// `done` of `total` are done. Cheap enough to be called for each thousand rows; draws ten times a
    /// second.
    void Show(std::int64_t done, std::int64_t total);

private:
    std::string m_label;
    bool m_isOn;
    std::chrono::steady_clock::time_point m_next{};
};

} // namespace reportctl::terminal
