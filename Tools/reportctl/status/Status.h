#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include <sys/types.h>

#include "Ledger/Reader.h"
#include "Tools/reportctl/ledger/Rates.h"

/// What can be known of one user's service at a moment. Plain values: what gathers them, what judges them and
/// what shows them are apart. Nothing stands for what is not known or not there.
namespace reportctl::status {

/// Who has bound the service's port.
struct PortHolder {
    std::optional<pid_t> process; ///< Another user's process is not always to be seen.
    std::optional<std::string> name;
    std::string user; ///< Its name, or its number where it has none.
};

struct Service {
    bool isRunning = false;
    bool isListening = false;
    std::optional<pid_t> process;
    std::optional<std::int64_t> startedAtMs;
    std::optional<std::string> version;
    std::optional<std::string> buildId;
    std::optional<PortHolder> portHolder;
    std::optional<std::string> otherUser; ///< Whose service holds the machine's lock, if it is not this one.
    bool hasLogger = false;               ///< Its plug-ins: loaded, or beside the program while nothing runs.
    bool hasStore = false;
    bool hasSdk = false;
};

struct Store {
    std::string path;
    bool isPresent = false;
    std::uint64_t bytes = 0;
    std::uint64_t walBytes = 0;
    bool hasTables = false;
    std::optional<int> schemaVersion;
    std::optional<std::int64_t> rows;
    bool areRowsCounted = true; ///< Else the span of their ids, which is more where rows between are gone.
    std::optional<std::string> newestCreateTime;
    std::string problem; ///< Why it could not be read.
};

struct Outbox {
    struct Module {
        std::string id;
        std::optional<std::int64_t> waiting;
        std::int64_t lastSequence = 0;
    };
    std::string path;
    bool isPresent = false;
    std::optional<std::int64_t> waiting;
    std::optional<std::int64_t> waitingBytes;
    std::optional<std::int64_t> delivered;
    std::optional<std::int64_t> refused;
    std::optional<std::int64_t> deadLetters;
    std::optional<std::int64_t> dropped;
    std::optional<std::int64_t> lastDeliveredAtMs;
    std::vector<Module> modules;
    std::optional<std::string> endpoint;    ///< Without secrets.
    std::optional<std::string> lastFailure; ///< Its line of the log, unless events are taken again since.
    std::string problem;
};

struct Log {
    struct Line {
        std::int64_t atMs = 0;
        std::string level;
        std::string site; ///< With line and function.
        std::string text;
    };
    std::string directory;
    std::uint64_t bytes = 0;
    int errors = 0; ///< In the last ten minutes, as far as what was read reaches.
    int warnings = 0;
    std::vector<Line> last;             ///< Warnings and errors, the oldest first.
    std::optional<Line> lastFromOutbox; ///< The last thing that the outbox told, however long ago.
};

struct Disk {
    std::optional<std::uint64_t> freeBytes;
    std::optional<std::uint64_t> totalBytes;
};

struct Status {
    std::int64_t atMs = 0;
    Service service;
    ReportLedger::Look ledger;
    ledger::Rates lastMinute;
    ledger::Rates lastSecond;
    Store store;
    Outbox outbox;
    Log log;
    Disk disk;
};

enum class Verdict { Healthy = 0, Degraded = 1, Down = 2 }; ///< Its number is the exit code.

struct Judgement {
    Verdict verdict = Verdict::Healthy;
    std::vector<std::string> reasons; ///< The worst first; each says what to do.
};

/// Looks at everything; changes no file.
Status Gather();

/// A pure function of what was gathered.
Judgement Judge(const Status& status);

/// One object, with a line feed at its end. docs/Status.md names its members.
std::string JsonOf(const Status& status, const Judgement& judgement);

/// One screen for a person.
std::string ScreenOf(const Status& status, const Judgement& judgement, bool isColoured);

/// In the text format that Prometheus reads.
std::string MetricsOf(const Status& status, const Judgement& judgement);

/// Milliseconds since 1970 as "2026-11-21T14:05:06.789Z".
std::string IsoTime(std::int64_t ms);

} // namespace reportctl::status
