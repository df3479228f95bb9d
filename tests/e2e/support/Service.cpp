#include "tests/e2e/support/Service.h"

#include <cerrno>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>
#include <stdexcept>

#include <Poco/Net/DatagramSocket.h>
#include <Poco/Net/SocketAddress.h>
#include <Poco/RegularExpression.h>
#include <SQLiteCpp/SQLiteCpp.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tests/support/FileContent.h"
#include "tests/support/ProcessStatus.h"
#include "tests/support/WaitUntil.h"

namespace {

const std::string PROGRAM = "SyncServiceReport";
const std::vector<std::string> PLUGINS = {"libBoostLogger.dylib", "libOrvekSqlite.dylib",
                                          "libMetrikSdk.dylib"};

std::vector<char*> Pointers(std::vector<std::string>& texts) {
    std::vector<char*> pointers;
    for (auto& text : texts)
        pointers.push_back(text.data());
    pointers.push_back(nullptr);
    return pointers;
}

/// The exit code, or minus the signal's number.
int CodeOf(int status) {
    return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

/// The fields of the report port's line in the kernel's table of UDP sockets; empty when nothing is bound.
std::vector<std::string> KernelsLineOfThePort() {
    std::ifstream table("/proc/net/udp");
    for (std::string line; std::getline(table, line);)
        if (line.find(": 0100007F:270D ") != std::string::npos) { // 127.0.0.1:9997
            std::istringstream fields(line);
            return {std::istream_iterator<std::string>(fields), {}};
        }
    return {};
}

} // namespace

Service::Service() {
    // The program looks for its plug-ins in its own directory. A copy of the program may have other plug-ins
    // than the original.
    std::filesystem::copy_file(std::filesystem::path(SSR_BIN_DIR) / PROGRAM,
                               m_program.Path() + "/" + PROGRAM);
    for (const auto& plugin : PLUGINS)
        std::filesystem::create_symlink(std::filesystem::path(SSR_BIN_DIR) / plugin,
                                        m_program.Path() + "/" + plugin);
    // A sanitizer looks for leaks at exit. On a busy machine, this takes longer than the crash handler's
    // deadline. A sanitizer also demands to be the first library, but some tests load another library before
    // the program.
    m_environment = {"XDG_DATA_HOME=" + DataDirectory(), "HOME=" + DataDirectory(), "PATH=/usr/bin:/bin",
                     "METRIK_START_SPREAD=0", // the outbox's first request at once
                     "ASAN_OPTIONS=detect_leaks=0:verify_asan_link_order=0"};
}

Service::~Service() {
    ExpectBalance();
    Kill();
    // A program with a data race does not end after the sanitizer's report.
    if (const auto output = Output(); output.find("Sanitizer: ") != std::string::npos)
        ADD_FAILURE() << output;
}

/// Expects that each received report has ended, waits, or was lost, after any fault. There may be no ledger
/// when the disk took none.
void Service::ExpectBalance() {
    const auto isBalanced = [this] {
        const auto books = Books();
        return books.sight != ReportLedger::Sight::Damaged && (!books.counting || books.balanced);
    };
    EXPECT_TRUE(WaitUntil(isBalanced, std::chrono::seconds(1)))
        << ReportLedger::UnaccountedIn(Books().total) << " reports are missing in the ledger";
}

void Service::Remove(const std::string& plugin) {
    if (!std::filesystem::remove(m_program.Path() + "/" + plugin))
        throw std::runtime_error("no plug-in " + plugin);
}

pid_t Service::Spawn(const std::string& program, const std::vector<std::string>& arguments) const {
    std::vector<std::string> words = {program};
    words.insert(words.end(), arguments.begin(), arguments.end());
    auto environment = m_environment;
    const auto argv = Pointers(words);
    const auto envp = Pointers(environment);
    const int output = ::open((m_program.Path() + "/output").c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600);
    const pid_t process = ::fork();
    if (process == 0) {
        ::dup2(output, STDOUT_FILENO);
        ::dup2(output, STDERR_FILENO);
        if (m_closesStandardDescriptors && program.ends_with("/" + PROGRAM))
            for (const int descriptor : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO})
                ::close(descriptor);
        ::execve(program.c_str(), argv.data(), envp.data());
        ::_exit(127);
    }
    ::close(output);
    return process;
}

pid_t Service::LaunchReportctl(const std::vector<std::string>& arguments) const {
    return Spawn(std::string(SSR_BIN_DIR) + "/reportctl", arguments);
}

int Service::Reportctl(const std::vector<std::string>& arguments) const {
    int status = 0;
    ::waitpid(LaunchReportctl(arguments), &status, 0);
    return CodeOf(status);
}

void Service::Install() const {
    if (const int code = Reportctl({"setup"}); code != 0)
        throw std::runtime_error("set-up ended with " + std::to_string(code) + ": " + Output());
}

void Service::Launch() {
    m_process = Spawn(m_program.Path() + "/" + PROGRAM, {});
}

void Service::Start() {
    Launch();
    if (!WaitUntil([this] { return Bound() || !IsRunning(); }))
        throw std::runtime_error("the service neither bound its port nor ended");
}

pid_t Service::LaunchAnother() const {
    return Spawn(m_program.Path() + "/" + PROGRAM, {});
}

int Service::RunAnother() const {
    int status = 0;
    ::waitpid(LaunchAnother(), &status, 0);
    return CodeOf(status);
}

bool Service::IsRunning() {
    siginfo_t state{};
    return m_process > 0 &&
           ::waitid(P_PID, static_cast<id_t>(m_process), &state, WEXITED | WNOHANG | WNOWAIT) == 0 &&
           state.si_pid == 0;
}

void Service::Signal(int signal) const {
    ::kill(m_process, signal);
}

void Service::Signal(int signal, pid_t thread) const {
    ::syscall(SYS_tgkill, m_process, thread, signal);
}

std::optional<int> Service::AwaitEnd(std::chrono::milliseconds deadline) {
    if (!WaitUntil([this] { return !IsRunning(); }, deadline))
        return std::nullopt;
    int status = 0;
    ::waitpid(m_process, &status, 0);
    m_process = -1;
    return CodeOf(status);
}

void Service::Kill() {
    if (m_process <= 0)
        return;
    Signal(SIGKILL);
    ::waitpid(m_process, nullptr, 0);
    m_process = -1;
}

void Service::Send(const std::string& text) {
    static Poco::Net::DatagramSocket socket(Poco::Net::SocketAddress("127.0.0.1", 0));
    socket.sendTo(text.data(), static_cast<int>(text.size()), Poco::Net::SocketAddress("127.0.0.1", 9997));
}

void Service::AwaitQuiet() {
    const std::string marker = "marker" + std::to_string(++m_markers);
    Send(R"({"eventID":")" + marker + "\"}");
    const auto stored = [&] {
        return Count(DatabaseFile(), "select count(*) from OperLog where eventID='" + marker + "'") == 1;
    };
    // A report is counted a moment after its row can be seen. Without a ledger, there is nothing to wait for.
    const auto counted = [&] { return ReportLedger::WaitingIn(Books().total) == 0; };
    if (!WaitUntil([&] { return stored() && counted(); }, std::chrono::seconds(60)))
        throw std::runtime_error("a report was not stored in time; the log: " + Log().substr(0, 4000));
    SQLite::Database database(DatabaseFile(), SQLite::OPEN_READWRITE, 10'000);
    database.exec("delete from OperLog where eventID='" + marker + "'");
}

std::string Service::Output() const {
    return ContentOf(m_program.Path() + "/output");
}

std::string Service::Log() const {
    return ContentOf(LogFile());
}

std::vector<Service::Line> Service::LogLines() const {
    static const Poco::RegularExpression FORM(
        R"(^\d{4}-\d\d-\d\d \d\d:\d\d:\d\d\.\d{3} (\w+) +\[(\d+):(\d+)\] \[([^\]]+)\] (.*)$)");
    std::vector<Line> lines;
    const std::string content = Log();
    // The log may end in a part of a line, because the size of a file grows page by page while a line is
    // written.
    std::istringstream log(content.substr(0, content.rfind('\n') + 1));
    for (std::string text; std::getline(log, text);) {
        std::vector<std::string> parts;
        if (FORM.split(text, parts) != 6)
            throw std::runtime_error("a line of the log has not the log's form: " + text);
        lines.push_back({parts[1], std::stoi(parts[2]), std::stoi(parts[3]), parts[4], parts[5]});
    }
    return lines;
}

std::vector<Service::Line> Service::LogLines(const std::string& site) const {
    auto lines = LogLines();
    std::erase_if(lines, [&site](const Line& line) { return line.site != site; });
    return lines;
}

::testing::AssertionResult Service::AwaitLines(const std::string& site, std::size_t count) const {
    if (WaitUntil([&] { return LogLines(site).size() == count; }))
        return ::testing::AssertionSuccess();
    return ::testing::AssertionFailure()
           << LogLines(site).size() << " lines of " << site << " instead of " << count;
}

std::vector<std::string> Service::Query(const std::string& file, const std::string& sql) const {
    std::vector<std::string> rows;
    try {
        const SQLite::Database database(file, SQLite::OPEN_READWRITE, 10'000);
        SQLite::Statement query(database, sql);
        while (query.executeStep()) {
            std::string row;
            for (int column = 0; column < query.getColumnCount(); ++column)
                row += (column > 0 ? "|" : "") + query.getColumn(column).getString();
            rows.push_back(row);
        }
    } catch (const SQLite::Exception&) { // the file or table does not exist yet
    }
    return rows;
}

std::int64_t Service::Count(const std::string& file, const std::string& sql) const {
    const auto rows = Query(file, sql);
    return rows.empty() ? -1 : std::stoll(rows.front());
}

long Service::ResidentKilobytes() const {
    return NumberInStatusOf(m_process, "VmRSS");
}

bool Service::Bound() {
    return !KernelsLineOfThePort().empty();
}

std::int64_t Service::DroppedByKernel() {
    const auto fields = KernelsLineOfThePort();
    return fields.empty() ? -1 : std::stoll(fields.back());
}

bool Service::TookAllDatagrams() {
    const auto fields = KernelsLineOfThePort();
    // This field has the bytes that wait to be sent, and the bytes that wait to be received.
    return !fields.empty() && fields[4].ends_with(":00000000");
}
