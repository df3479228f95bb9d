#include "bench/simulation/Collector.h"

#include <algorithm>

#include <fmt/chrono.h>

namespace Fleet {
namespace {

std::string HttpDate(MetrikSdk::WallTime time) {
    const auto seconds = std::chrono::floor<std::chrono::seconds>(time);
    return fmt::format("{:%a, %d %b %Y %H:%M:%S} GMT", fmt::gmtime(seconds.time_since_epoch().count()));
}

} // namespace

Collector::Collector(const Config& config) : m_config(config) {
    m_taken.status = 200;
    m_later.status = 503;
    if (config.retryAfter > 0)
        m_later.retryAfter = std::to_string(config.retryAfter);
    m_noConnection.fault = "Connection refused";
    m_away503.status = 503;
    if (config.isAnnounced)
        m_away503.retryAfter = HttpDate(WallAt(config.outageTo));
    m_noAnswer.fault = "Timeout was reached";
    m_noAnswer.began = true;
}

const MetrikSdk::otlp::HttpResult& Collector::ResultOf(Kind kind) const {
    switch (kind) {
    case Kind::Taken:
        return m_taken;
    case Kind::Later:
        return m_later;
    case Kind::NoConnection:
        return m_noConnection;
    case Kind::Away503:
        return m_away503;
    case Kind::NoAnswer:
        break;
    }
    return m_noAnswer;
}

Collector::Answer Collector::Post(Tick sent, std::size_t events) {
    const double arrives = sent + m_config.roundTrip / 2.0;
    if (IsAway(arrives))
        return WhileAway(sent);
    const bool isBack = m_config.outageTo != NEVER && arrives >= m_config.outageTo;
    const auto capacity = (isBack ? m_config.returnCapacity : m_config.capacity) / m_config.collectors;
    if (capacity <= 0)
        return Accepted(sent, arrives);
    const auto starts = std::max(arrives, m_busyUntil);
    if (starts - arrives > m_config.queue)
        return {sent + m_config.roundTrip, Kind::Later, false};
    m_busyUntil = starts + static_cast<double>(events) * SECOND / capacity;
    return Accepted(sent, m_busyUntil);
}

Collector::Answer Collector::WhileAway(Tick sent) const {
    switch (m_config.away) {
    case Away::Refused:
        return {sent + m_config.roundTrip, Kind::NoConnection, false};
    case Away::Answers503:
        return {sent + m_config.roundTrip, Kind::Away503, false};
    case Away::Silent:
        break;
    }
    return {sent + m_config.timeout, Kind::NoAnswer, false};
}

/// The events of an accepted request are stored at `done`, unless the collector goes away before.
Collector::Answer Collector::Accepted(Tick sent, double done) const {
    const double gaveUp = sent + m_config.timeout;
    const auto answered = done + m_config.roundTrip / 2.0;
    const auto ends = sent < m_config.outageFrom ? m_config.outageFrom : NEVER;
    if (done >= ends)
        return {static_cast<Tick>(std::min<double>(ends, gaveUp)), Kind::NoAnswer, false};
    if (answered >= ends || answered > gaveUp)
        return {static_cast<Tick>(std::min(answered, gaveUp)), Kind::NoAnswer, true};
    return {static_cast<Tick>(answered), Kind::Taken, true};
}

} // namespace Fleet
