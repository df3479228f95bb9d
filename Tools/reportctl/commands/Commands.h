#pragma once

#include <array>

namespace CLI {
class App;
}

/// The commands of reportctl. Each command has one file in this folder, with its options and the texts that
/// it prints; the work itself is in the other folders. A new command needs a file, its line in
/// CMakeLists.txt, and two lines here.
namespace reportctl::commands {

/// Adds one command to the command line. When the user gave this command, parsing runs it and puts the
/// program's exit code into `exitCode`, which must live until the parsing ends.
using Add = void(CLI::App& app, int& exitCode);

Add AddSetup;   ///< `setup` makes the directories and files that the service needs.
Add AddRun;     ///< `run` becomes the service as soon as no other service runs.
Add AddStatus;  ///< `status` shows whether the service is healthy, and what to do when it is not.
Add AddMetrics; ///< `metrics` writes the status as figures for a monitoring system.
Add AddSend;  ///< `send` sends the running service a report or a control message, from flags or line by line.
Add AddTail;  ///< `tail` follows the log.
Add AddFind;  ///< `find` shows where a report is: in the log, the store or the outbox.
Add AddStats; ///< `stats` counts reports.
Add AddExport;  ///< `export` writes the rows of the store as CSV or JSON Lines.
Add AddBackup;  ///< `backup` copies the databases.
Add AddPrune;   ///< `prune` deletes old rows.
Add AddOutbox;  ///< `outbox` lists events, retries or purges dead letters, and tests the collector.
Add AddForward; ///< `forward` sends new rows of the store to a collector.
Add AddBundle;  ///< `bundle` writes a file for support.
Add AddPage;    ///< `page` writes the status as a page for a browser.

/// All commands, in the order of the help.
inline constexpr std::array ALL{&AddSetup, &AddRun,  &AddStatus, &AddMetrics, &AddSend,
                                &AddTail,  &AddFind, &AddStats,  &AddExport,  &AddBackup,
                                &AddPrune, &AddPage, &AddOutbox, &AddForward, &AddBundle};

} // namespace reportctl::commands
