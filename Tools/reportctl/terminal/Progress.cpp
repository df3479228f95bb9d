#include "Tools/reportctl/terminal/Progress.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <string_view>
#include <utility>

#include <fmt/format.h>
#include <unistd.h>

namespace reportctl::terminal {
namespace {

constexpr std::size_t BAR_WIDTH = 30;
constexpr auto BETWEEN_DRAWINGS = std::chrono::milliseconds(100);
constexpr auto ERASE_LINE = "\r\x1b[K";

bool IsTerminalThatMovesItsCursor() {
    const char* terminal = std::getenv("TERM"); // NOLINT(concurrency-mt-unsafe): this program has one thread
    return ::isatty(STDERR_FILENO) != 0 && terminal != nullptr && std::string_view(terminal) != "dumb";
}

} // namespace

Progress::Progress(std::string label) : m_label(std::move(label)), m_isOn(IsTerminalThatMovesItsCursor()) {}

Progress::~Progress() {
    if (m_isOn)
        fmt::print(stderr, "{}", ERASE_LINE);
}

void Progress::Show(std::int64_t done, std::int64_t total) {
    if (!m_isOn || std::chrono::steady_clock::now() < m_next)
        return;
    m_next = std::chrono::steady_clock::now() + BETWEEN_DRAWINGS;
    const double part = total > 0 ? std::clamp(double(done) / double(total), 0.0, 1.0) : 0.0;
    const auto filled = static_cast<std::size_t>(part * BAR_WIDTH);
    fmt::print(stderr, "{}{} [{}{}] {:3.0f} %", ERASE_LINE, m_label, std::string(filled, '#'),
               std::string(BAR_WIDTH - filled, ' '), part * 100);
    std::fflush(stderr);
}

} // namespace reportctl::terminal
