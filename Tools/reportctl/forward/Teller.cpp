#include "Tools/reportctl/forward/Teller.h"

namespace reportctl::forward {
namespace {

constexpr std::chrono::milliseconds INTERVAL = std::chrono::minutes(1);

} // namespace

void Teller::Failure(const std::string& text, MetrikSdk::WallTime now) {
    const auto since = now - m_toldAt;
    if (text == m_last && since >= std::chrono::milliseconds(0) && since < INTERVAL)
        return;
    m_last = text;
    m_toldAt = now;
    m_write(text);
}

void Teller::Over(const std::string& text) {
    if (m_last.empty())
        return;
    m_last.clear();
    m_write(text);
}

} // namespace reportctl::forward
