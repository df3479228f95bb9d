#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>

#include "Modules/MetrikSdk/outbox/CountWaiter.h"
#include "Modules/MetrikSdk/upload/AsideList.h"
#include "Modules/MetrikSdk/upload/BatchPlan.h"
#include "Modules/MetrikSdk/upload/BatchSizer.h"
#include "Modules/MetrikSdk/upload/RetryPolicy.h"

namespace MetrikSdk::upload {

/// What to wait for before the next pass.
struct Pause {
    std::chrono::milliseconds duration{0};                  ///< At most this long.
    std::int64_t untilWaiting = outbox::CountWaiter::NEVER; ///< Or until so many events wait.
};

/// Where events wait, as far as the rules need it.
class EventQueue {
public:
    EventQueue() = default;
    virtual ~EventQueue() = default;
    EventQueue(const EventQueue&) = delete;
    EventQueue& operator=(const EventQueue&) = delete;

    /// Looks at the oldest events that are not in `without`. If the rules decide to send, the request
    /// consists of the first of these events.
    virtual QueueHead TakeOldest(std::size_t maxEvents, const EventKeys& without) = 0;

    /// Looks at this event, which becomes the next request. Returns whether it still waits.
    virtual bool TakeOne(const EventKey& key) = 0;

    /// Whether an event waits that is not among `these`.
    virtual bool HasOthersThan(const EventKeys& these) = 0;
};

/// Decides what an uploader does next, and what an answer means. It reads no file, sends nothing and does not
/// sleep; its callers do. So the simulation of a fleet (bench/fleet) can run the same rules as the service.
///
///     WhatNext ──► a pause       ──► WhatNext
///              └─► a request     ──► Answered: what becomes of it, and a pause ──► …
///
/// Threads: one. Failure: passes on what the queue throws. Pure otherwise: the caller passes time and random
/// numbers.
class UploadRules {
public:
    /// The settings outlive this object.
    explicit UploadRules(const OutboxSettings& settings)
        : m_settings(settings), m_sizer(settings.batch.maxEvents), m_aside(settings.aside) {}

    struct Next {
        std::size_t count = 0; ///< How many of the events of the queue's last look to send; 0: pause.
        bool isAside = false;  ///< The request is one event that had stepped aside.
        Pause pause;
    };
    Next WhatNext(EventQueue& queue, WallTime now);

    /// The events that stepped aside.
    const EventKeys& Aside() const { return m_aside.Keys(); }

    /// How many of the events to send, now that the length of the body is known. When there are fewer, ask
    /// again.
    std::size_t Fitting(const RequestSize& encoded) const;

    /// A request, as far as the rules need it.
    struct Sent {
        RequestSize size;
        bool isAside = false;
        EventKey first;
    };

    enum class Outcome {
        Taken,        ///< Delete the events.
        NotNow,       ///< Keep them.
        Halved,       ///< Keep them; the next request has half as many.
        StaysAside,   ///< Keep the one event; others are sent before it.
        OutOfStrikes, ///< Move the one event to the dead letters: it was tried often enough.
        Refused,      ///< Move the one event to the dead letters: it will never be taken.
        Abandoned     ///< Keep them; the process ends the uploads.
    };
    struct Decision {
        Outcome outcome = Outcome::NotNow;
        AsideList::Strikes strikes; ///< Of an event that had stepped aside.
        Pause pause;
    };

    /// `random` is uniform in [0, 1).
    Decision Answered(const Sent& sent, const otlp::HttpResult& result, double random, WallTime now,
                      EventQueue& queue);

    /// The one event of the request was moved to the dead letters.
    void MovedToDeadLetters(const Sent& sent);

    /// The queue could not be read or written.
    Pause QueueFailed(double random, WallTime now);

private:
    bool TakeAside(EventQueue& queue, WallTime now);
    Pause Idle(WallTime now) const;
    Decision Decide(const Sent& sent, const otlp::HttpResult& result, double random, WallTime now,
                    EventQueue& queue);
    void Taken(const Sent& sent);
    void NotTaken(const Sent& sent, Verdict verdict, WallTime now, EventQueue& queue);
    void StepAside(const EventKey& event, WallTime now, EventQueue& queue);
    Decision AsideFailed(const Sent& sent, WallTime now);
    Outcome Refused(const Sent& sent, Blame blame);
    Pause WaitAfter(const otlp::HttpResult& result, double random, WallTime now);
    Pause WaitAfterRefusals(const otlp::HttpResult& result, double random, WallTime now);

    const OutboxSettings& m_settings;
    BatchSizer m_sizer;
    AsideList m_aside;
    bool m_isAsidesTurn = false; ///< One that is aside is tried next, if one is due.
    int m_failures = 0;          ///< Requests in a row that must be repeated.
    int m_refusalsInARow = 0;    ///< Events refused for good since one was last accepted.
};

} // namespace MetrikSdk::upload
