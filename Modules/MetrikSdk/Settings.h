#pragma once

#include <chrono>
#include <cstddef>
#include <string>

#include "Modules/MetrikSdk/otlp/ResourceConfig.h"

// What production runs with, and why. Tests hand in their own.
namespace MetrikSdk {

/// How much the outbox keeps while no collector takes it.
struct CapSettings {
    /// A million events of the common size. A desktop that is away from its collector for a month stays far
    /// below; a runaway module cannot fill a small disk.
    std::size_t maxWaitingBytes = std::size_t{512} * 1024 * 1024;
    /// Usage figures older than this change no decision any more, and a collector's store has closed the day.
    std::chrono::milliseconds maxAge = std::chrono::days(30);
    /// So long must the wall clock have run without a step before events are dropped by age. A machine that
    /// starts without the right time has it from the network within minutes.
    std::chrono::milliseconds clockAgreement = std::chrono::hours(1);
    /// Looking for old events costs a read; they age by the day.
    std::chrono::milliseconds ageCheckInterval = std::chrono::minutes(1);
    /// Rows dropped in one transaction: a few milliseconds of one call.
    std::size_t maxDropsAtOnce = 1000;
    /// Drops this far apart are two incidents, and each is told.
    std::chrono::milliseconds dropRunEnds = std::chrono::minutes(10);
    /// Refused events are kept for a person to look at. A person looks at no more than this, and a collector
    /// that refuses everything must not move the whole outbox here unbounded.
    std::size_t maxDeadLetters = 10'000;
    std::size_t maxDeadLetterBytes = std::size_t{16} * 1024 * 1024;
    /// One event. A datagram carries 10 KiB; a hundred times that is no event any more, and the batch bound
    /// below must hold at least one.
    std::size_t maxEventBytes = std::size_t{1024} * 1024;
};

/// Which events travel together.
struct BatchSettings {
    /// The batch size that telemetry SDKs agree on by default; larger ones gain nothing on a local network.
    std::size_t maxEvents = 512;
    /// Structured JSON is two to three times the stored size, about nine times where the payload is a list of
    /// small integers. The common case fits the 4 MiB that collectors accept; one that does not is answered
    /// with 413, and halved.
    std::size_t maxBytes = std::size_t{1024} * 1024;
    /// An event waits this long for company before it is sent alone.
    std::chrono::milliseconds linger = std::chrono::seconds(1);
};

/// When to try again. The wait after n failures is uniform in [0, min(maxWait, firstWait * 2^(n-1))]: a fleet
/// that lost its collector together must not come back together.
struct RetrySettings {
    std::chrono::milliseconds firstWait = std::chrono::seconds(1);
    /// A collector that came back is noticed within this.
    std::chrono::milliseconds maxWait = std::chrono::minutes(5);
    /// A Retry-After beyond this is a mistake, or malice.
    std::chrono::milliseconds maxRetryAfter = std::chrono::days(1);
    /// So many events refused for good without one accepted between them are the address's fault, or the
    /// credentials', and no longer the events': each further refusal is then waited for like a network fault.
    int refusalsBeforeWaiting = 10;
};

/// What becomes of an event that a collector does not take alone, while it takes others.
struct AsideSettings {
    /// Before the second try; doubles with each further one.
    std::chrono::milliseconds firstPause = std::chrono::minutes(1);
    /// A collector that was mended has the event within this.
    std::chrono::milliseconds maxPause = std::chrono::hours(1);
    /// So many tries, between which others were taken: some four hours. What fails for so long fails for
    /// ever.
    int strikes = 10;
    /// One that comes on top is sent again and again until there is room. They cost memory and a look at each
    /// batch.
    std::size_t maxEvents = 512;
};

/// How the outbox file is looked after.
struct FileSettings {
    /// The user's data directory. Only below it is a directory made that is missing; see
    /// Sqlite::SafeDirectory.
    std::string dataDirectory;
    /// A file that cannot be opened is tried again this often; the first event after that interval pays.
    std::chrono::milliseconds reopenInterval = std::chrono::milliseconds(500);
    /// Patience with another process that holds the write lock. Reports queue up behind this, which loses
    /// nothing; giving up loses the event.
    std::chrono::milliseconds lockPatience = std::chrono::seconds(5);
    /// Patience once that was used up, until an event gets through again: a lock that is held for good must
    /// not cost five seconds an event. Also the uploader's, which can come back later.
    std::chrono::milliseconds shortLockPatience = std::chrono::milliseconds(50);
};

struct OutboxSettings {
    CapSettings caps;
    BatchSettings batch;
    RetrySettings retry;
    AsideSettings aside;
    FileSettings file;
    otlp::ResourceConfig resource; ///< From the environment.
    /// The failure callback ends in the service's log: the same cause is told this often at most.
    std::chrono::milliseconds tellInterval = std::chrono::minutes(1);
    /// How long releasing an outbox waits for its uploader.
    std::chrono::milliseconds stopPatience = std::chrono::milliseconds(900);
};

} // namespace MetrikSdk
