#pragma once

#include <cstdint>
#include <vector>

#include "bench/simulation/BodySizes.h"
#include "bench/simulation/Collector.h"
#include "bench/simulation/Config.h"
#include "bench/simulation/Desktop.h"
#include "bench/simulation/Tally.h"
#include "bench/simulation/Wheel.h"

namespace Fleet {

/// One collector with its desktops, through the whole simulated time. Shards are independent of each other,
/// so they can run on any thread and in any order. Threads: one.
class Shard {
public:
    /// Has the `count` desktops from number `first` on. Run adds to `tally`.
    Shard(const Config& config, const BodySizes& sizes, std::uint32_t first, std::uint32_t count,
          Tally& tally);

    void Run();

private:
    enum Kind : std::uint32_t { SwitchOn, SwitchOff, Restart, StoreEvent, Wake, Answer, OutageEnds };
    /// A desktop, and what happens to it now.
    struct Scene {
        std::uint32_t index;
        std::uint32_t id;
        Desktop& desktop;
        Tick now;
    };

    void Handle(const Happening& happening);
    void Add(const Scene& scene, Tick at, Kind kind) { m_wheel.Add({at, scene.index, kind}); }
    void StartService(const Scene& scene);
    void StopService(const Scene& scene);
    void SwitchedOff(const Scene& scene);
    void Store(const Scene& scene);
    void KeepWithinCaps(const Scene& scene);
    std::size_t DropOldest(const Scene& scene, const MetrikSdk::outbox::CapWatch::Order& order);
    void Pass(const Scene& scene);
    void PauseFor(const Scene& scene, const MetrikSdk::upload::Pause& pause);
    void Send(const Scene& scene, const Queue& queue, const MetrikSdk::upload::UploadRules::Next& next);
    void MarkSent(const Scene& scene, std::uint32_t fromEarly);
    void NoteTaken(const Scene& scene);
    void Answered(const Scene& scene);
    void Leave(const Scene& scene, bool isDelivered);
    void PopHead(const Scene& scene, bool isDelivered);
    void CountLeft(const Scene& scene, Tick storedAt, bool isTaken, bool isDelivered);
    void CountAtEnd();
    MetrikSdk::upload::UploadRules::Sent SentBy(const Desktop& desktop) const;
    Queue QueueOf(const Scene& scene) const;

    const Config& m_config;
    const BodySizes& m_sizes;
    std::uint32_t m_first;
    Tally& m_tally;
    Collector m_collector;
    Wheel m_wheel;
    std::vector<Desktop> m_desktops;
    std::size_t m_mostFitting;
};

} // namespace Fleet
