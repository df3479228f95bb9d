#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

#include "Modules/MetrikSdk/outbox/CapWatch.h"
#include "Modules/MetrikSdk/report/LossRun.h"
#include "Modules/MetrikSdk/upload/UploadRules.h"
#include "bench/simulation/Collector.h"
#include "bench/simulation/Config.h"
#include "bench/simulation/WorkingDay.h"

namespace Fleet {

/// A request that a desktop has sent.
struct Flight {
    Tick sentAt = NEVER;
    Tick answerAt = NEVER; ///< NEVER: none is under way.
    Collector::Answer answer;
    std::uint32_t fromRange = 0; ///< How many of its events are from the outbox's range.
    std::uint32_t firstRow = 0;
    std::uint32_t count = 0;
    bool isAside = false;
};

/// The events that wait on one desktop. The newest ones are a range without a gap, of which only the first
/// event's time is kept. Events before the range are kept one by one: they stepped aside, and later events
/// were sent before them.
struct Outbox {
    struct Early {
        std::uint32_t row;
        Tick storedAt;
        bool isTaken; ///< A collector has stored it, and the desktop got no answer.
        bool isSent;  ///< It is part of the last request.
    };

    std::size_t Waiting() const { return early.size() + count; }

    EventTimes head; ///< At the first event of the range; at the next event to come when the range is empty.
    std::uint32_t headRow = 1;
    std::uint32_t count = 0; ///< Events of the range.
    /// A collector has stored the rows of the range below this one, and the desktop got no answer.
    std::uint32_t takenBelow = 0;
    std::vector<Early> early; ///< The events before the range, oldest first.
};

/// One desktop: its outbox, and the rules by which the outbox is emptied. It has some 500 bytes, and more
/// for each event that stepped aside. Other events that wait take no memory.
struct Desktop {
    Desktop(const Config& config, std::uint32_t id)
        : coming(config, id), outbox{coming, 1, 0, 0, {}}, random(RandomFor(config.seed, id, 2)),
          caps(config.settings.caps) {}

    EventTimes coming; ///< Of the next event.
    Outbox outbox;
    Random random;
    std::optional<MetrikSdk::upload::UploadRules> rules; ///< Empty while its service does not run.
    MetrikSdk::outbox::CapWatch caps;
    std::unique_ptr<MetrikSdk::report::LossRun> drops; ///< Null until the first event is dropped.
    Flight flight;
    Tick wakeAt = NEVER;
    std::int64_t untilWaiting = 0;
};

/// Shows a desktop's outbox to the rules.
class Queue : public MetrikSdk::upload::EventQueue {
public:
    /// `mostFitting` is how many events of the common size fit a request by its bytes.
    Queue(const Config& config, std::uint32_t id, Outbox& outbox, std::size_t mostFitting)
        : m_config(config), m_id(id), m_outbox(outbox), m_mostFitting(mostFitting) {}

    MetrikSdk::upload::QueueHead TakeOldest(std::size_t maxEvents,
                                            const MetrikSdk::EventKeys& without) override;
    bool TakeOne(const MetrikSdk::EventKey& key) override;
    bool HasOthersThan(const MetrikSdk::EventKeys& these) override;

    /// How many events of Outbox::early are among the events of the last look, and the row of their first.
    std::uint32_t FromEarly() const { return m_fromEarly; }
    std::uint32_t FirstRow() const { return m_firstRow; }

private:
    void PassBy(const MetrikSdk::EventKeys& without);

    const Config& m_config;
    std::uint32_t m_id;
    Outbox& m_outbox;
    std::size_t m_mostFitting;
    std::uint32_t m_fromEarly = 0;
    std::uint32_t m_firstRow = 0;
};

} // namespace Fleet
