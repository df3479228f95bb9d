#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include <sys/types.h>

#include "Ledger/Reader.h"
#include "tests/support/TemporaryDirectory.h"

/// The real program with the real plug-ins, in a user data directory of its own. The sandbox of the test
/// gives it port 9997 and the pid file's directory. Killed by the destructor, which fails the test when a
/// sanitizer found something in it, or when its ledger does not balance.
class Service {
public:
    /// A line of the log, taken apart.
    struct Line {
        std::string level; ///< Without the padding.
        pid_t process;
        pid_t thread;
        std::string site; ///< Such as "App/ReportServer:42 Recv".
        std::string message;
    };

    Service();
    ~Service();
    Service(const Service&) = delete;
    Service& operator=(const Service&) = delete;

    /// Leaves a plug-in out, from the next start on.
    void Remove(const std::string& plugin);

    /// Adds to the environment, from the next start on.
    void SetEnvironment(const std::string& nameAndValue) { m_environment.push_back(nameAndValue); }

    /// Starts the program with descriptors 0 to 2 closed, from the next start on.
    void CloseStandardDescriptors() { m_closesStandardDescriptors = true; }

    /// Runs `reportctl` with these arguments in the service's data directory; its exit code. Output goes to
    /// Output().
    int Reportctl(const std::vector<std::string>& arguments) const;

    /// What an installation does: `reportctl setup`.
    void Install() const;

    /// Starts the program and waits until it takes datagrams (see Bound), or has ended.
    void Start();

    /// Starts the program and waits for nothing.
    void Launch();

    /// Starts a second program beside the first, and gives its exit code; -1 when it was killed by a signal.
    int RunAnother() const;

    /// Starts a second program beside the first and waits for nothing; the caller ends it.
    pid_t LaunchAnother() const;

    bool IsRunning();

    /// Sends a signal to the process, or to one of its threads.
    void Signal(int signal) const;
    void Signal(int signal, pid_t thread) const;

    /// Waits for the end; the exit code, or minus the signal, or nothing when it did not end in time.
    std::optional<int> AwaitEnd(std::chrono::milliseconds deadline = std::chrono::seconds(10));

    /// SIGKILL, and wait.
    void Kill();

    pid_t Process() const { return m_process; }

    /// Sends one datagram, a test's own process being as good as any of the suite's.
    static void Send(const std::string& text);

    /// Waits until a report that is sent now has been stored, and so all sent before it handled.
    void AwaitQuiet();

    const std::string& DataDirectory() const { return m_data.Path(); }
    std::string LogFile() const { return DataDirectory() + "/hublink/log/metrik/Report.log"; }
    std::string DatabaseFile() const { return DataDirectory() + "/hublink/database/Report.db"; }
    std::string OutboxFile() const { return DataDirectory() + "/hublink/database/MetrikOutbox.db"; }
    std::string LedgerFile() const { return DataDirectory() + "/hublink/run/Report.ledger"; }
    static constexpr auto PID_FILE = "/Library/Preferences/hublink/Report.pid";

    /// What the program, and reportctl, wrote to standard output and standard error.
    std::string Output() const;

    std::string Log() const;
    std::vector<Line> LogLines() const;

    /// The lines of one site, such as "App/ReportServer:42 Recv".
    std::vector<Line> LogLines(const std::string& site) const;

    /// The rows of a query, columns joined by a bar; empty when there is no such file or table yet.
    std::vector<std::string> Query(const std::string& file, const std::string& sql) const;

    std::vector<std::string>
    Rows(const std::string& columns = "eventID,value,createTime,pType,extData3,extData4") const {
        return Query(DatabaseFile(), "select " + columns + " from OperLog order by id");
    }
    std::int64_t Count(const std::string& file, const std::string& sql) const;
    std::int64_t RowCount() const { return Count(DatabaseFile(), "select count(*) from OperLog"); }

    /// What its ledger says.
    ReportLedger::Look Books() const { return ReportLedger::LookAt(LedgerFile()); }

    /// One number of it, since the service was installed.
    std::uint64_t Counted(ReportLedger::Counter counter) const { return Books().total[counter]; }
    std::uint64_t Counted(ReportLedger::Outcome outcome) const {
        return Books().total[static_cast<unsigned>(outcome)];
    }

    /// Of its memory, what the machine has in use for it.
    long ResidentKilobytes() const;

    /// Whether the report port is bound in this network.
    static bool Bound();

    /// Datagrams that the kernel dropped at the report port, by the socket's own counter.
    static std::int64_t DroppedByKernel();

    /// Whether the program has taken every datagram off its socket.
    static bool TookAllDatagrams();

private:
    void ExpectBalance();
    std::vector<std::string> Environment() const;
    pid_t Spawn(const std::string& program, const std::vector<std::string>& arguments) const;

    TemporaryDirectory m_data;    ///< The user data directory.
    TemporaryDirectory m_program; ///< The program and its plug-ins.
    std::vector<std::string> m_environment;
    bool m_closesStandardDescriptors = false;
    pid_t m_process = -1;
    int m_markers = 0;
};
