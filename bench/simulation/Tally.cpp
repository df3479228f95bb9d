#include "bench/simulation/Tally.h"

namespace Fleet {
namespace {

void AddSecond(Second& sum, const Second& other) {
    sum.bytes += other.bytes;
    sum.stored += other.stored;
    sum.requests += other.requests;
    sum.noAnswer += other.noAnswer;
    sum.later += other.later;
    sum.events += other.events;
    sum.left += other.left;
    sum.backlogLeft += other.backlogLeft;
}

} // namespace

void Tally::Add(const Tally& other) {
    for (std::size_t i = 0; i < seconds.size(); ++i)
        AddSecond(seconds[i], other.seconds[i]);
    stored += other.stored;
    delivered += other.delivered;
    taken += other.taken;
    duplicates += other.duplicates;
    unconfirmed += other.unconfirmed;
    dropped += other.dropped;
    droppedTaken += other.droppedTaken;
    dropRuns += other.dropRuns;
    deadLettered += other.deadLettered;
    waiting += other.waiting;
    backlog += other.backlog;
    triedAlone += other.triedAlone;
    desktopBytes += other.desktopBytes;
}

} // namespace Fleet
