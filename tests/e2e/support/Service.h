#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include <sys/types.h>

#include <gtest/gtest.h>

#include "Ledger/Reader.h"
#include "tests/support/TemporaryDirectory.h"

/// The real program with the real plug-ins and a user data directory of its own. The sandbox gives the test
/// port 9997 and the pid file's directory. The destructor kills the program, and fails the test when a
/// sanitizer found an error or when the ledger does not balance.
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

    /// Removes a plug-in, from the next start on.
    void Remove(const std::string& plugin);

    /// Adds a variable to the environment, from the next start on.
    void SetEnvironment(const std::string& nameAndValue) { m_environment.push_back(nameAndValue); }

    /// Starts the program with descriptors 0 to 2 closed, from the next start on.
    void CloseStandardDescriptors() { m_closesStandardDescriptors = true; }

    /// Runs `reportctl` with these arguments in the service's data directory. Returns its exit code; its
    /// output goes to Output().
    int Reportctl(const std::vector<std::string>& arguments) const;

    /// Starts `reportctl` in the same way and waits for nothing; the caller ends it.
    pid_t LaunchReportctl(const std::vector<std::string>& arguments) const;

    /// What an installation does: `reportctl setup`.
    void Install() const;

    /// Starts the program, and waits until it takes datagrams (see Bound) or has ended.
    void Start();

    /// Starts the program and waits for nothing.
    void Launch();

    /// Starts a second process beside the first, and waits for its end. Returns its exit code; -1 when a
    /// signal killed it.
    int RunAnother() const;

    /// Starts a second process beside the first, and waits for nothing. The caller must end it.
    pid_t LaunchAnother() const;

    bool IsRunning();

    /// Sends a signal to the process, or to one of its threads.
    void Signal(int signal) const;
    void Signal(int signal, pid_t thread) const;

    /// Waits for the program's end. Returns the exit code or minus the signal's number; nothing when the
    /// program did not end in time.
    std::optional<int> AwaitEnd(std::chrono::milliseconds deadline = std::chrono::seconds(10));

    /// Sends SIGKILL, and waits for the end.
    void Kill();

    pid_t Process() const { return m_process; }

    /// Sends one datagram from the test's process. For the service, this is the same as any program of the
    /// suite.
    static void Send(const std::string& text);

    /// Sends a report and waits until it is stored. Everything that was sent before has then been handled and
    /// counted.
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

    /// Waits until the log has exactly this many lines of one site. In a burst, a line may be written a
    /// little later than what it tells happens, so that a test that counts them right away may see too few.
    ::testing::AssertionResult AwaitLines(const std::string& site, std::size_t count) const;

    /// The rows of a query, columns joined by a bar; empty when there is no such file or table yet.
    std::vector<std::string> Query(const std::string& file, const std::string& sql) const;

    std::vector<std::string>
    Rows(const std::string& columns = "eventID,value,createTime,pType,extData3,extData4") const {
        return Query(DatabaseFile(), "select " + columns + " from OperLog order by id");
    }
    std::int64_t Count(const std::string& file, const std::string& sql) const;
    std::int64_t RowCount() const { return Count(DatabaseFile(), "select count(*) from OperLog"); }

    /// The service's ledger.
    ReportLedger::Look Books() const { return ReportLedger::LookAt(LedgerFile()); }

    /// One counter of the ledger, since the service was installed.
    std::uint64_t Counted(ReportLedger::Counter counter) const { return Books().total[counter]; }
    std::uint64_t Counted(ReportLedger::Outcome outcome) const {
        return Books().total[static_cast<unsigned>(outcome)];
    }

    /// How much real memory the program uses.
    long ResidentKilobytes() const;

    /// Whether the report port is bound in this network.
    static bool Bound();

    /// How many datagrams the kernel dropped at the report port, by the counter of the socket.
    static std::int64_t DroppedByKernel();

    /// Whether the program has taken all datagrams from its socket.
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
