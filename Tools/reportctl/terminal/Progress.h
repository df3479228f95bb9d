#pragma once

#include <chrono>
#include <cstdint>
#include <string>

namespace reportctl::terminal {

/// A line on standard error that shows how far a long command is. It is shown on a terminal only. The
/// destructor erases it, so that only the command's result stays on the screen.
class Progress {
public:
    /// `label` says what is being done, such as "exporting".
    explicit Progress(std::string label);
    ~Progress();
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;

    /// Shows that `done` of `total` are done. Draws at most ten times a second, so it may be called for each
    /// thousand rows.
    void Show(std::int64_t done, std::int64_t total);

private:
    std::string m_label;
    bool m_isOn;
    std::chrono::steady_clock::time_point m_next{};
};

} // namespace reportctl::terminal
