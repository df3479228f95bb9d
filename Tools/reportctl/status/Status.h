#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include <sys/types.h>

#include "Ledger/Reader.h"
#include "Tools/reportctl/ledger/Rates.h"

/// The state of one user's service at one moment, as plain values. Gathering, judging and showing them are
/// separate functions. An empty optional means that the value is not known or does not exist.
namespace reportctl::status {

/// A program that holds what only one service on the machine can have: the port, or the pid file's lock.
struct PortHolder {
    std::optional<pid_t> process; ///< Not known when this user may not see the process.
    std::optional<std::string> name;
    std::string user; ///< The user's name, or number when it has no name. Empty: not known.
};

/// What the kernel knows of the service's own socket.
struct Intake {
    std::uint64_t unreadBytes = 0;
    std::uint32_t dropped = 0; ///< Since the socket was bound; it wraps around.
};

struct Service {
    bool isRunning = false;
    bool isListening = false;
    std::optional<pid_t> process;
    std::optional<std::int64_t> startedAtMs;
    std::optional<std::string> version;
    std::optional<std::string> buildId;
    std::optional<PortHolder> portHolder;
    std::optional<PortHolder> portSharer; ///< Another program at the same address and port.
    std::optional<Intake> intake;
    std::optional<PortHolder> lockHolder; ///< Of the pid file's lock.
    std::string lockProblem;              ///< What is wrong with the pid file; empty when nothing is.
    std::optional<std::string> otherUser; ///< The user whose service holds the machine's lock instead.
    /// Whether the process has loaded the plug-ins. When that is not known, for example because nothing runs:
    /// whether their files are beside the program.
    bool hasLogger = false;
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
    bool areRowsCounted = true; ///< False: `rows` is last id - first id + 1, too much where ids are missing.
    std::optional<std::string> newestCreateTime;
    std::string problem; ///< Why the store could not be read; empty when it could.
};

struct Outbox {
    struct Module {
        std::string id;
        std::optional<std::int64_t> waiting;
        std::int64_t lastSequence = 0;
    };
    std::string path;
    bool isPresent = false;
    std::optional<std::string> id;         ///< The UUID that was made with the file.
    std::optional<std::int64_t> begunAtMs; ///< When that was.
    std::optional<std::int64_t> waiting;
    std::optional<std::int64_t> waitingBytes;
    std::optional<std::int64_t> delivered;
    std::optional<std::int64_t> refused;
    std::optional<std::int64_t> deadLetters;
    std::optional<std::int64_t> dropped;
    std::optional<std::int64_t> lastDeliveredAtMs;
    std::optional<std::int64_t> uploadFailedAtMs; ///< When uploads began to fail last.
    std::string uploadFailure;                    ///< And why.
    std::vector<Module> modules;
    std::optional<std::string> endpoint;    ///< The collector's address, without secrets.
    std::optional<std::string> lastFailure; ///< What the outbox told, if the failure lasts.
    std::string problem;
};

struct Log {
    struct Line {
        std::int64_t atMs = 0;
        std::string level;
        std::string site; ///< Such as "App/ReportServer:42 Recv".
        std::string text;
    };
    struct Repeated {
        Line line; ///< When it came last.
        int times = 0;
    };
    std::string directory;
    std::uint64_t bytes = 0;
    int errors = 0; ///< Of the last ten minutes, in the part of the log that was read.
    int warnings = 0;
    std::vector<Line> last; ///< The last warnings and errors, the oldest first.
    /// The last of the different warnings and errors, each with how often the part that was read has it; the
    /// one that came last is the last. A storm of one error leaves the others in it.
    std::vector<Repeated> lastTexts;
    /// The last line of each cause that the process told about its outbox, the oldest first.
    std::vector<Line> fromOutbox;
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

enum class Verdict { Healthy = 0, Degraded = 1, Down = 2 }; ///< The number is the exit code.

struct Judgement {
    Verdict verdict = Verdict::Healthy;
    std::vector<std::string> reasons; ///< The worst first. Each says what is wrong and what to do.
};

/// Gathers the whole status. Changes no file.
Status Gather();

/// Judges the gathered status. A pure function.
Judgement Judge(const Status& status);

/// The status as one JSON object, with a line feed at its end. docs/Status.md names its members.
std::string JsonOf(const Status& status, const Judgement& judgement);

/// What the terminal can show.
struct View {
    bool isColoured = false;
    std::size_t columns = 0; ///< 0: long lines are not broken
};

/// The status as one screen of text for a person, with local times.
std::string ScreenOf(const Status& status, const Judgement& judgement, const View& view);

/// The status as metrics in the text format that Prometheus reads.
std::string MetricsOf(const Status& status, const Judgement& judgement);

} // namespace reportctl::status
