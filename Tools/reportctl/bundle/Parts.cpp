#include "Tools/reportctl/bundle/Parts.h"

#include <array>
#include <cstdio>
#include <deque>
#include <filesystem>
#include <fstream>
#include <memory>

#include <SQLiteCpp/Statement.h>
#include <fmt/format.h>
#include <sqlite3.h>
#include <sys/utsname.h>
#include <unistd.h>

#include "Common/Paths.h"
#include "Modules/MetrikSdk/otlp/CurlLibrary.h"
#include "SystemTool/CommonTool.h"
#include "SystemTool/IO/Directory.h"
#include "Tools/reportctl/log/Files.h"
#include "Tools/reportctl/log/Follower.h"
#include "Tools/reportctl/outbox/Database.h"
#include "Tools/reportctl/service/Environment.h"
#include "Tools/reportctl/service/Program.h"
#include "Tools/reportctl/store/Paths.h"
#include "Tools/reportctl/store/Store.h"
#include "Tools/reportctl/terminal/ShellQuoted.h"

namespace reportctl::bundle {
namespace {

namespace fs = std::filesystem;

constexpr std::size_t LOG_LINES = 2000;

/// Runs another command of this program and returns what it prints. The command has a process of its own, so
/// that its failure affects only its own part of the bundle. It prints into a pipe, so it breaks no line, and
/// the redaction finds a statement on the line where it begins.
std::string OutputOf(const std::string& command) {
    const auto program = SystemTool::IO::Directory::GetExcutableDirectory() + "reportctl";
    const auto line = fmt::format("{} {} 2>&1", terminal::ShellQuoted(program), command);
    const std::unique_ptr<FILE, int (*)(FILE*)> pipe(
        ::popen(line.c_str(), "r"), // NOLINT(cert-env33-c): a fixed command of this program
        &::pclose);
    if (!pipe)
        return "could not be run\n";
    std::string output;
    std::array<char, 4096> piece{};
    for (ssize_t size = 0; (size = ::read(::fileno(pipe.get()), piece.data(), piece.size())) > 0;)
        output.append(piece.data(), static_cast<std::size_t>(size));
    return output;
}

std::string Versions() {
    return fmt::format("{}\nSQLite {}\n{}\n", service::VersionText(), ::sqlite3_libversion(),
                       MetrikSdk::otlp::Curl().version());
}

std::string SizeOf(const fs::path& path) {
    std::error_code error;
    const auto size = fs::file_size(path, error);
    return error ? error.message() : fmt::format("{} bytes", size);
}

/// A list of a directory's files with their modes and sizes.
std::string FilesIn(const std::string& directory) {
    std::string text = directory + ":\n";
    std::error_code error;
    fs::directory_iterator entry(directory, error);
    for (; !error && entry != fs::directory_iterator(); entry.increment(error))
        text += fmt::format("  {:o} {} {}\n", static_cast<unsigned>(entry->symlink_status().permissions()),
                            entry->path().filename().string(), SizeOf(entry->path()));
    return error ? text + "  " + error.message() + "\n" : text;
}

/// The names of the collector's settings, and their sizes. Their texts stay out, because they may hold keys.
std::string Settings() {
    const auto environment = service::OfTheService();
    std::string text =
        environment.process == 0
            ? "No service of this user runs; settings of this environment:\n"
            : fmt::format("Settings of the running service, process {}:\n", environment.process);
    for (const auto& [name, value] : environment.variables)
        if (name.starts_with("OTEL_") || name.ends_with("_proxy") || name.ends_with("_PROXY"))
            text += fmt::format("  {} is set ({} bytes)\n", name, value.size());
    return text;
}

std::string System() {
    utsname name{};
    ::uname(&name);
    const auto data = SystemTool::CommonTool::GetUserDataDir();
    std::error_code error;
    const auto space = fs::space(data, error);
    return fmt::format("{}\n{} {} {}\nuser {}\nfree on the disk of {}: {} bytes\n\n{}\n{}{}{}",
                       SystemTool::CommonTool::GetOSVersionString(), name.sysname, name.release, name.machine,
                       ::geteuid(), data, error ? 0 : space.available, Settings(),
                       FilesIn(SyncServiceReport::Paths::Databases(data)), FilesIn(log::LogDirectory()),
                       FilesIn(SyncServiceReport::Paths::SHARED));
}

/// The rows of a query, one a line, with a bar between the columns.
std::string Rows(SQLite::Database& database, const std::string& sql) {
    SQLite::Statement query(database, sql);
    std::string text;
    while (query.executeStep())
        for (int column = 0; column < query.getColumnCount(); ++column)
            text += fmt::format("{}{}", query.getColumn(column).getString(),
                                column + 1 < query.getColumnCount() ? "|" : "\n");
    return text;
}

std::string SchemaOf(SQLite::Database database) {
    std::string text;
    for (const auto* setting :
         {"user_version", "journal_mode", "auto_vacuum", "page_size", "page_count", "freelist_count"})
        text += fmt::format("-- {}: {}", setting, Rows(database, fmt::format("pragma {}", setting)));
    return text + Rows(database, "select sql || ';' from sqlite_schema where sql is not null");
}

std::string CountsOfStore() {
    auto database = store::OpenToRead(store::StorePath());
    return "rows|first id|last id\n" + Rows(database, "select count(*), min(id), max(id) from OperLog") +
           "\nthe most frequent modules|rows\n" +
           Rows(database,
                "select substr(eventID, 1, instr(eventID || '|', '|') - 1) as m, count(*) as n from OperLog "
                "group by m order by n desc limit 50");
}

std::string CountsOfOutbox() {
    auto database = outbox::OpenToLook(store::OutboxPath());
    SQLite::Statement status(database, "select * from outbox_status");
    status.executeStep();
    std::string text;
    for (int column = 0; column < status.getColumnCount(); ++column)
        text += fmt::format("{}: {}\n", status.getColumnName(column), status.getColumn(column).getString());
    status.reset();
    return text + "\nmodule|stored\n" +
           Rows(database,
                "select module_id, last_sequence from module order by last_sequence desc limit 50") +
           "\ndead letters by answer\n" +
           Rows(database, "select status, count(*) from dead_letter group by status order by status");
}

std::string LastLogLines(const Redaction& redaction) {
    const auto directory = log::LogDirectory();
    log::Follower follower(directory, log::LastRotatedFiles(directory, 1));
    std::deque<std::string> lines;
    for (std::string line; follower.Next(line);) {
        lines.push_back(std::move(line));
        if (lines.size() > LOG_LINES)
            lines.pop_front();
    }
    std::string text;
    for (const auto& line : lines)
        text += redaction.OfLogLine(line) + "\n";
    return text;
}

} // namespace

std::vector<Part> AllParts(const Redaction& redaction) {
    const auto plain = [&redaction](auto content) {
        return [&redaction, content] { return redaction.OfText(content()); };
    };
    return {
        {"status.txt", "what `reportctl status` says", plain([] { return OutputOf("status"); })},
        {"metrics.txt", "what `reportctl metrics` says", plain([] { return OutputOf("metrics"); })},
        {"versions.txt", "versions of the programs and libraries", plain(Versions)},
        {"system.txt", "the system, the disk, the service's files, which settings are there", plain(System)},
        {"store-schema.sql", "the tables of the store, without rows",
         plain([] { return SchemaOf(store::OpenToRead(store::StorePath())); })},
        {"outbox-schema.sql", "the tables of the outbox, without rows",
         plain([] { return SchemaOf(outbox::OpenToLook(store::OutboxPath())); })},
        {"store-counts.txt", "how many rows the store has, by module", plain(CountsOfStore)},
        {"outbox-counts.txt", "how many events the outbox has seen, and what became of them",
         plain(CountsOfOutbox)},
        {"log.txt", "the last 2,000 lines of the log", [&redaction] { return LastLogLines(redaction); }}};
}

} // namespace reportctl::bundle
