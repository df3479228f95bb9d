#include "Modules/MetrikSdk/upload/BatchSizer.h"

#include <algorithm>

namespace MetrikSdk::upload {
namespace {

/// How many full requests must be taken before a larger one is tried. A larger one may fail only after a
/// whole time-out, so it is tried rarely.
constexpr int REQUESTS_BEFORE_GROWTH = 8;
constexpr std::size_t GROWTH_DIVISOR = 8;

std::size_t Grown(std::size_t limit) {
    return limit + std::max<std::size_t>(1, limit / GROWTH_DIVISOR);
}

} // namespace

std::size_t BatchSizer::MaxEvents() const {
    const auto searched = m_suspects > 0 ? m_suspects : m_span;
    return Searching() && searched > 0 ? std::min(m_now.events, searched) : m_now.events;
}

bool BatchSizer::Failed(const RequestSize& sent, Blame blame) {
    if (blame == Blame::Later && !Searching() && ++m_laters < 2)
        return false;
    if (blame == Blame::TooLarge && sent.events > 1)
        LearnTooLong(sent.bodyBytes);
    if (sent.events <= 1)
        return true;
    Shrink(sent.events, blame);
    return false;
}

void BatchSizer::Shrink(std::size_t sent, Blame blame) {
    if (!Searching()) {
        m_before = m_now;
        m_span = sent;
    }
    const auto half = (sent + 1) / 2;
    m_sizeIsSuspected = blame == Blame::NoAnswer || blame == Blame::Later;
    m_suspects = sent;
    m_suspectIsAside = false;
    m_now.events = half;
    // A collector that is away fails every size, so only the first failure says something about the size.
    if (!m_failing)
        m_now.doubles = half;
    m_failing = true;
    m_fullRequests = 0;
}

void BatchSizer::Taken(const RequestSize& sent) {
    m_laters = 0;
    m_failing = false;
    GrowBody(sent.bodyBytes);
    if (m_suspectIsAside)
        Found();
    if (!Searching())
        return Grow(sent.events);
    m_span -= std::min(sent.events, m_span);
    m_suspects -= std::min(sent.events, m_suspects);
    if (m_span > 0)
        return;
    if (!m_sizeIsSuspected)
        m_now = *m_before;
    m_before.reset();
}

void BatchSizer::Found() {
    if (Searching())
        m_now = *m_before;
    m_before.reset();
    m_suspectIsAside = false;
    m_laters = 0;
    m_span = 0;
    m_suspects = 0;
}

void BatchSizer::Grow(std::size_t sent) {
    if (m_now.events < m_now.doubles) {
        m_now.events = std::min(2 * m_now.events, m_now.doubles);
    } else if (sent >= m_now.events && ++m_fullRequests >= REQUESTS_BEFORE_GROWTH) {
        m_fullRequests = 0;
        m_now.events = std::min(Grown(m_now.events), m_max);
    }
}

void BatchSizer::LearnTooLong(std::size_t bodyBytes) {
    m_tooLong = std::min(m_tooLong, bodyBytes);
    m_maxBody = std::min(m_maxBody, bodyBytes / 2);
    m_fullBodies = 0;
}

void BatchSizer::GrowBody(std::size_t bodyBytes) {
    if (m_maxBody == UNKNOWN || bodyBytes < m_maxBody / 2 || ++m_fullBodies < REQUESTS_BEFORE_GROWTH)
        return;
    m_fullBodies = 0;
    m_maxBody = std::min(Grown(m_maxBody), m_tooLong - 1);
}

} // namespace MetrikSdk::upload
