#pragma once

#include <cstddef>

#include "Modules/MetrikSdk/otlp/HttpResult.h"
#include "bench/simulation/Config.h"

namespace Fleet {

/// One collector behind the balancer. It takes events at a constant rate. Requests wait in its queue, and
/// when the queue is full, it answers 503. It goes away and returns at the configured times. Requests that it
/// has accepted and not answered when it goes away get no answer.
class Collector {
public:
    explicit Collector(const Config& config);

    enum class Kind : unsigned char { Taken, Later, NoConnection, Away503, NoAnswer };
    struct Answer {
        Tick at = 0; ///< When the desktop has it, or gives up.
        Kind kind = Kind::NoConnection;
        bool isTaken = false; ///< The events are stored behind the collector, also when the answer gets lost.
    };

    /// A desktop sends a request at this time. The times of the calls must not decrease.
    Answer Post(Tick sent, std::size_t events);

    /// The answer in the form that the rules read.
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
