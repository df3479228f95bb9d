#include <algorithm>
#include <array>

#include <fmt/format.h>

#include "Common/Paths.h"
#include "Tools/reportctl/status/Recent.h"
#include "Tools/reportctl/status/Status.h"
#include "Tools/reportctl/terminal/Quantity.h"

namespace reportctl::status {
namespace {

using ReportLedger::Outcome;

/// Datagrams that wait for less than this are a burst, or a disk that is slow for a moment.
constexpr std::chrono::milliseconds LONGEST_UNREAD = std::chrono::seconds(5);
constexpr std::uint64_t LEAST_FREE = 500'000'000;
constexpr std::uint64_t SMALL_DISK = 10'000'000'000; // below this size, the least is a part of the disk
constexpr std::uint64_t PART_OF_A_SMALL_DISK = 20;   // 5 %

/// A loss that is the fault of the service or the machine, with what to do about it. All other refusals are
/// mistakes of senders.
struct Fault {
    unsigned place;
    const char* what;
    const char* advice;
};
constexpr std::array FAULTS{
    Fault{ReportLedger::DROPPED_BY_KERNEL, "dropped by the kernel before the service could take them",
          "They came faster than the service takes them: let senders send more slowly, or raise "
          "net.core.rmem_max."},
    Fault{ReportLedger::LOST_AT_ENDS, "received and not handled when the service ended",
          "Find out in the log, or in the system's journal, what ended it."},
    Fault{static_cast<unsigned>(Outcome::Store), "refused by the store",
          "The log has each of them with the reason: docs/Reliability.md tells what it means."},
    Fault{static_cast<unsigned>(Outcome::NoStore), "refused because there is no store",
          "Put libOrvekSqlite.dylib beside the service's program and restart the service."},
    Fault{static_cast<unsigned>(Outcome::Analytics), "refused by the analytics SDK, or for want of it",
          "Look for FailCallBackFun and for \"Failed to load\" in the log."},
    Fault{static_cast<unsigned>(Outcome::Exception), "lost to an exception",
          "Look for \"exception\" in the log; the machine may be out of memory."},
};

class Judging {
public:
    explicit Judging(const Status& status) : m_status(status) {}

    Judgement Result() {
        JudgeService();
        JudgeLedger();
        JudgePlugins();
        JudgeStore();
        JudgeOutbox();
        JudgeDisk();
        return m_judgement;
    }

private:
    void Add(Verdict verdict, std::string reason) {
        m_judgement.verdict = std::max(m_judgement.verdict, verdict);
        m_judgement.reasons.push_back(std::move(reason));
    }

    static std::string Words(const PortHolder& holder) {
        return fmt::format("{}{}{}", holder.name.value_or("a program"),
                           holder.user.empty() ? "" : " of user " + holder.user, ProcessOf(holder));
    }

    static std::string ProcessOf(const PortHolder& holder) {
        return holder.process ? fmt::format(" (process {})", *holder.process) : "";
    }

    /// Why no service can start, or what to do so that one starts.
    std::string WhyNotRunning() const {
        const Service& service = m_status.service;
        if (service.lockHolder && service.lockHolder->name)
            return fmt::format("The lock of {} is held by {}, so no service can start. End that program.",
                               SyncServiceReport::Paths::PidFile(), Words(*service.lockHolder));
        if (service.lockHolder)
            return fmt::format("The lock of {} is held by a program that this user may not see{}. Your "
                               "service can run when that one has ended: `reportctl run` waits for it.",
                               SyncServiceReport::Paths::PidFile(), ProcessOf(*service.lockHolder));
        if (!service.lockProblem.empty())
            return service.lockProblem;
        return "The service is not running. Start it: `systemctl --user start sync-service-report`, or sign "
               "in to the suite again.";
    }

    void JudgeService() {
        const Service& service = m_status.service;
        if (!service.isRunning && service.otherUser)
            return Add(Verdict::Down,
                       fmt::format("The service of user {} runs on this machine{}, and only one can. Yours "
                                   "can run when that one has ended: `reportctl run` waits for it.",
                                   *service.otherUser,
                                   service.lockHolder ? ProcessOf(*service.lockHolder) : ""));
        if (!service.isRunning)
            Add(Verdict::Down, WhyNotRunning());
        if (!service.isListening && service.portHolder)
            Add(Verdict::Down,
                fmt::format("Port 9997 is held by {}: reports go there. End that program, then restart "
                            "the service.",
                            Words(*service.portHolder)));
        else if (service.isRunning && !service.isListening)
            Add(Verdict::Down, "The service runs and does not listen on port 9997. Restart it.");
        if (service.portSharer)
            Add(Verdict::Degraded,
                fmt::format("Port 9997 is shared with {}: a part of the reports goes there and is not "
                            "handled. End that program.",
                            Words(*service.portSharer)));
        JudgeIntake();
    }

    void JudgeIntake() {
        const auto& look = m_status.ledger;
        if (!m_status.service.intake || !look.counting)
            return;
        const Intake& intake = *m_status.service.intake;
        const auto unreadFor = look.atMs - LastReadMs(look);
        if (intake.unreadBytes > 0 && unreadFor >= LONGEST_UNREAD.count())
            Add(Verdict::Degraded,
                fmt::format("The service has not read its socket for {} seconds, although reports wait "
                            "there. Find out what stops it, or restart it.",
                            unreadFor / 1000));
    }

    /// What the kernel dropped and the ledger does not have yet: the service asks about once a second, and
    /// not while it hangs. Both counts wrap around in 32 bits here.
    std::uint64_t DroppedSinceCounted() const {
        const auto& look = m_status.ledger;
        if (!m_status.service.intake || !look.counting)
            return 0;
        const auto counted = ReportLedger::SinceStart(look)[ReportLedger::DROPPED_BY_KERNEL];
        const auto more =
            static_cast<std::int32_t>(m_status.service.intake->dropped - static_cast<std::uint32_t>(counted));
        return more > 0 ? static_cast<std::uint64_t>(more) : 0;
    }

    /// When the receiving thread was last seen at work. It writes a mark each second, also while nothing
    /// comes.
    static std::int64_t LastReadMs(const ReportLedger::Look& look) {
        const auto received = static_cast<std::int64_t>(look.lastMs[ReportLedger::RECEIVED]);
        return look.recent.empty() ? received : std::max(received, look.recent.back().atMs);
    }

    /// The sentence about a fault. `count` is 0 when the number is not known: the ledger's marks are younger
    /// than the reports, for example because the clock was set back.
    static std::string Told(const Fault& fault, std::uint64_t count) {
        const auto reports = count > 1    ? fmt::format("{} reports were", count)
                             : count == 1 ? "a report was"
                                          : "reports were";
        return fmt::format("In the last ten minutes, {} {}. {}", reports, fault.what, fault.advice);
    }

    bool IsRecent(unsigned place) const {
        const auto lastMs = static_cast<std::int64_t>(m_status.ledger.lastMs[place]);
        return lastMs != 0 && status::IsRecent(lastMs, m_status.atMs);
    }

    void JudgeLedger() {
        const auto& look = m_status.ledger;
        if (m_status.service.isRunning && !look.counting)
            Add(Verdict::Degraded,
                "The service keeps no ledger in its file, so what it refuses or loses is not counted. "
                "docs/Ledger.md tells why that may be; restart the service when the cause is repaired.");
        if (look.sight != ReportLedger::Sight::Sound)
            return;
        for (const Fault& fault : FAULTS) {
            const bool isDrop = fault.place == ReportLedger::DROPPED_BY_KERNEL;
            const auto uncounted = isDrop ? DroppedSinceCounted() : 0;
            if (uncounted != 0 || (look.total[fault.place] != 0 && IsRecent(fault.place)))
                Add(Verdict::Degraded, Told(fault, ledger::GrownIn(look, fault.place, RECENT) + uncounted));
        }
        if (!look.balanced)
            Add(Verdict::Degraded, fmt::format("The ledger does not balance: {} reports are unaccounted for. "
                                               "Please report this with the "
                                               "output of `reportctl status --json`.",
                                               ReportLedger::UnaccountedIn(look.total)));
    }

    void JudgePlugins() {
        const auto judge = [this](bool isThere, const char* library, const char* loss) {
            if (!isThere)
                Add(Verdict::Degraded,
                    fmt::format("The plug-in {} is missing: {}. Install the service again and "
                                "restart it.",
                                library, loss));
        };
        judge(m_status.service.hasStore, "libOrvekSqlite.dylib", "no report is stored");
        judge(m_status.service.hasSdk, "libMetrikSdk.dylib", "no event is taken for analytics");
        judge(m_status.service.hasLogger, "libBoostLogger.dylib", "there is no log");
    }

    void JudgeStore() {
        const Store& store = m_status.store;
        if (!store.problem.empty())
            Add(Verdict::Degraded,
                fmt::format("The store {} cannot be read: {}. docs/Database.md tells how to repair "
                            "it.",
                            store.path, store.problem));
        else if (!store.isPresent)
            Add(Verdict::Degraded,
                fmt::format("The store {} is missing. Make it: `reportctl setup`.", store.path));
        else if (!store.hasTables)
            Add(Verdict::Degraded,
                fmt::format("The store {} has not its tables. Make them: `reportctl setup`.", store.path));
    }

    void JudgeOutbox() {
        const Outbox& outbox = m_status.outbox;
        if (!outbox.problem.empty())
            Add(Verdict::Degraded,
                fmt::format("The outbox {} cannot be read: {}.", outbox.path, outbox.problem));
        if (outbox.deadLetters.value_or(0) > 0)
            Add(Verdict::Degraded,
                fmt::format(
                    "The collector refused {} for good. docs/Outbox.md tells how to look at dead letters, "
                    "and how to send them again.",
                    terminal::Counted(static_cast<std::uint64_t>(*outbox.deadLetters), "event")));
        if (outbox.lastFailure)
            Add(Verdict::Degraded,
                fmt::format("The outbox has a failure that lasts: {}", *outbox.lastFailure));
    }

    void JudgeDisk() {
        const Disk& disk = m_status.disk;
        if (!disk.freeBytes || !disk.totalBytes)
            return;
        const auto least =
            *disk.totalBytes < SMALL_DISK ? *disk.totalBytes / PART_OF_A_SMALL_DISK : LEAST_FREE;
        if (*disk.freeBytes < least)
            Add(Verdict::Degraded,
                fmt::format("Only {} MB are free where the service keeps its data. Make room there.",
                            *disk.freeBytes / 1'000'000));
    }

    const Status& m_status;
    Judgement m_judgement;
};

} // namespace

Judgement Judge(const Status& status) {
    return Judging(status).Result();
}

} // namespace reportctl::status
