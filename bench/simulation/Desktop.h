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
    std::uint32_t fromRange = 0; ///< Events of the range.
    std::uint32_t firstRow = 0;
    std::uint32_t count = 0;
    bool isAside = false;
};

/// What waits on one desktop: nearly always the newest events without a gap, of which only the first one's
/// time is kept. An event before them is one that others went past.
struct Outbox {
    struct Early {
        std::uint32_t row;
        Tick storedAt;
        bool isTaken; ///< A collector has it, and the desktop does not know.
        bool isSent;  ///< Part of the last request.
    };

    std::size_t Waiting() const { return early.size() + count; }

    EventTimes head; ///< Of the first event of the range; of the next one to come, when it is empty.
    std::uint32_t headRow = 1;
    std::uint32_t count = 0; ///< Events of the range.
    std::uint32_t takenBelow =
        0;                    ///< A collector has the rows of the range below, and the desktop does not know.
    std::vector<Early> early; ///< Oldest first.
};

/// One desktop: its outbox, and the rules by which it is emptied. Some 500 bytes, however many events wait.
struct Desktop {
    Desktop(const Config& config, std::uint32_t id)
        : coming(config, id), outbox{coming, 1, 0, 0, {}}, random(RandomFor(config.seed, id, 2)),
          caps(config.settings.caps) {}

    EventTimes coming; ///< Of the next event.
    Outbox outbox;
    Random random;
    std::optional<MetrikSdk::upload::UploadRules> rules; ///< While its service runs.
    MetrikSdk::outbox::CapWatch caps;
    std::unique_ptr<MetrikSdk::report::LossRun> drops; ///< Made with the first.
    Flight flight;
    Tick wakeAt = NEVER;
    std::int64_t untilWaiting = 0;
};

/// A desktop's outbox, as the rules look at it.
class Queue : public MetrikSdk::upload::EventQueue {
public:
    /// `mostFitting`: so many events of the common size fill a request by its bytes.
    Queue(const Config& config, std::uint32_t id, Outbox& outbox, std::size_t mostFitting)
        : m_config(config), m_id(id), m_outbox(outbox), m_mostFitting(mostFitting) {}

    MetrikSdk::upload::QueueHead TakeOldest(std::size_t maxEvents,
                                            const MetrikSdk::EventKeys& without) override;
    bool TakeOne(const MetrikSdk::EventKey& key) override;
    bool HasOthersThan(const MetrikSdk::EventKeys& these) override;

    /// What was looked at last: so many events of Outbox::early, and the row of the first event.
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
