#pragma once

#include <chrono>
#include <cstddef>
#include <string>

#include "Modules/MetrikSdk/otlp/ResourceConfig.h"

// The settings of production, and the reasons for them. Tests use their own settings.
namespace MetrikSdk {

/// How much the outbox keeps while no collector takes it.
struct CapSettings {
    /// A million events of the common size. A desktop that does not reach its collector for a month stays far
    /// below. And a module that reports without end cannot fill a small disk.
    std::size_t maxWaitingBytes = std::size_t{512} * 1024 * 1024;
    /// Usage figures that are older than this change no decision any more, and a collector's store no longer
    /// adds to such a day.
    std::chrono::milliseconds maxAge = std::chrono::days(30);
    /// Events are dropped by age only after the wall clock has run for this long without a step. A machine
    /// that starts with a wrong time gets the right time from the network within minutes.
    std::chrono::milliseconds clockAgreement = std::chrono::hours(1);
    /// How often to look for old events. A look takes a read, and events become too old only after days.
    std::chrono::milliseconds ageCheckInterval = std::chrono::minutes(1);
    /// How many rows one transaction drops at most. That takes a few milliseconds of one call.
    std::size_t maxDropsAtOnce = 1000;
    /// Drops that are further apart than this are two incidents, and each of them is reported.
    std::chrono::milliseconds dropRunEnds = std::chrono::minutes(10);
    /// Refused events are kept for a person to look at, and a person looks at no more than this. Without this
    /// limit, a collector that refuses everything would move the whole outbox here.
    std::size_t maxDeadLetters = 10'000;
    std::size_t maxDeadLetterBytes = std::size_t{16} * 1024 * 1024;
    /// The largest event. A datagram carries 10 KiB, and what is a hundred times larger is no event any more.
    /// The limit of a batch below must hold at least one event.
    std::size_t maxEventBytes = std::size_t{1024} * 1024;
};

/// Which events are sent together.
struct BatchSettings {
    /// The batch size that telemetry SDKs use by default. A larger one gains nothing on a local network.
    std::size_t maxEvents = 512;
    /// As structured JSON, an event is two to three times as long as in the outbox, and about nine times
    /// where its payload is a list of small integers. A usual batch fits the 4 MiB that collectors accept.
    /// The collector answers a longer one with 413, and then the batch is halved.
    std::size_t maxBytes = std::size_t{1024} * 1024;
    /// How long an event waits for further events before it is sent alone.
    std::chrono::milliseconds linger = std::chrono::seconds(1);
};

/// When to try again. The wait after n failures is random, uniform in [0, min(maxWait, firstWait * 2^(n-1))]:
/// the machines of a fleet that lost its collector must not all come back at the same moment.
struct RetrySettings {
    /// The first request after a start waits for a random time up to this: thousands of machines may start
    /// together, after a power cut or an update, and each has events waiting. docs/Fleet.md has the figures.
    std::chrono::milliseconds startSpread = std::chrono::minutes(1);
    std::chrono::milliseconds firstWait = std::chrono::seconds(1);
    /// When a collector comes back, the uploader notices it within this time.
    std::chrono::milliseconds maxWait = std::chrono::minutes(5);
    /// A Retry-After beyond this is a mistake, or an attack.
    std::chrono::milliseconds maxRetryAfter = std::chrono::days(1);
    /// A Retry-After is exceeded by a random time, up to as long again and up to this: see maxWait.
    std::chrono::milliseconds maxRetryAfterSpread = std::chrono::minutes(5);
    /// After this many events that were refused for good, with no accepted one between them, the address or
    /// the credentials are at fault and not the events. From then on, the uploader waits after each refusal
    /// as after a network fault.
    int refusalsBeforeWaiting = 10;
};

/// What happens to an event that a collector does not take alone, while it takes others.
struct AsideSettings {
    /// The pause before the second try. It doubles with each further try that counts (see AsideList).
    std::chrono::milliseconds firstPause = std::chrono::minutes(1);
    /// The longest pause. A collector that was repaired gets the event within this time.
    std::chrono::milliseconds maxPause = std::chrono::hours(1);
    /// How many strikes an event may have. A strike is a failed try between requests of others that were
    /// taken. Ten of them take some four hours. An event that fails for so long fails for ever.
    int strikes = 10;
    /// How many failed tries an event may have with others taken before each. What happens to the request
    /// after it does not count. So many tries take some two days. A collector that has too much to do takes
    /// the event before.
    int tries = 48;
    /// How many events that are aside are tried in turns. Each try is a request of one event. Other events
    /// are also sent before further ones, which are tried once there is room.
    std::size_t maxEvents = 512;
};

/// How the outbox file is opened, and how long to wait for it.
struct FileSettings {
    /// The user's data directory. Missing directories are made only below it; see Sqlite::SafeDirectory.
    std::string dataDirectory;
    /// How often to try again to open a file. The first event after this interval does it, and takes the time
    /// for it.
    std::chrono::milliseconds reopenInterval = std::chrono::milliseconds(500);
    /// How long an event waits for another process that holds the write lock. Reports queue up meanwhile,
    /// which loses nothing. To give up loses the event.
    std::chrono::milliseconds lockPatience = std::chrono::seconds(5);
    /// How long an event waits after an earlier one has waited in vain, until an event is stored again: a
    /// lock that is held for good must not take five seconds from each event. The uploader always waits this
    /// long, because it can come back later.
    std::chrono::milliseconds shortLockPatience = std::chrono::milliseconds(50);
};

struct OutboxSettings {
    CapSettings caps;
    BatchSettings batch;
    RetrySettings retry;
    AsideSettings aside;
    FileSettings file;
    otlp::ResourceConfig resource; ///< Read from the environment.
    /// The texts of the failure callback end in the service's log. So the same cause is reported at most once
    /// in this time.
    std::chrono::milliseconds tellInterval = std::chrono::minutes(1);
    /// How long the release of an outbox waits for its uploader.
    std::chrono::milliseconds stopPatience = std::chrono::milliseconds(900);
};

} // namespace MetrikSdk
