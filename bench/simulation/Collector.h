#pragma once

#include <cstddef>

#include "Modules/MetrikSdk/otlp/HttpResult.h"
#include "bench/simulation/Config.h"

namespace Fleet {

/// One collector behind the balancer. It works off what it accepted at its rate, accepts so much ahead, and
/// answers "later" to the rest. It goes away and returns as configured; what it had accepted and not answered
/// then stays without an answer.
class Collector {
public:
    explicit Collector(const Config& config);

    enum class Kind : unsigned char { Taken, Later, NoConnection, Away503, NoAnswer };
    struct Answer {
        Tick at = 0; ///< When the desktop has it, or gives up.
        Kind kind = Kind::NoConnection;
        bool isTaken = false; ///< The events are stored behind the collector, whatever the desktop learns.
    };

    /// A request that leaves a desktop at this time. To be called in the order of time.
    Answer Post(Tick sent, std::size_t events);

    /// The answer, as the rules take it.
    const MetrikSdk::otlp::HttpResult& ResultOf(Kind kind) const;

private:
    bool IsAway(double time) const { return time >= m_config.outageFrom && time < m_config.outageTo; }
    Answer WhileAway(Tick sent) const;
    Answer Accepted(Tick sent, double done) const;

    const Config& m_config;
    double m_busyUntil = 0;
    MetrikSdk::otlp::HttpResult m_taken;
    MetrikSdk::otlp::HttpResult m_later;
    MetrikSdk::otlp::HttpResult m_noConnection;
    MetrikSdk::otlp::HttpResult m_away503;
    MetrikSdk::otlp::HttpResult m_noAnswer;
};

} // namespace Fleet
