#pragma once

#include <array>

namespace CLI {
class App;
}

/// The commands of reportctl. Each has one file in this folder, with its flags and its words; what it does is
/// in the other rooms. A new command is a file, its line in CMakeLists.txt, and two lines here.
namespace reportctl::commands {

/// Adds one command to the command line. If the user gave this command, parsing runs it and puts the exit
/// code of the program into `exitCode`, which must outlive the parsing.
using Add = void(CLI::App& app, int& exitCode);

Add AddSetup;   ///< `setup` makes what the service needs.
Add AddRun;     ///< `run` becomes the service as soon as no other one runs.
Add AddStatus;  ///< `status` tells whether the service is healthy, and what to do when it is not.
Add AddMetrics; ///< `metrics` writes the same as figures for a monitoring system.
Add AddSend;  ///< `send` sends the running service a report or a control message, from flags or line by line.
Add AddTail;  ///< `tail` follows the log.
Add AddFind;  ///< `find` tells where a report ended.
Add AddStats; ///< `stats` counts reports.
Add AddExport; ///< `export` writes the rows of the store as CSV or JSON Lines.
Add AddBackup; ///< `backup` copies the databases.
Add AddPrune;  ///< `prune` deletes old rows.
Add AddOutbox; ///< `outbox` lists, retries, tests and purges.
Add AddBundle; ///< `bundle` writes a file for support.
Add AddPage;   ///< `page` writes a page to look at.

/// In the order of the help.
inline constexpr std::array ALL{&AddSetup, &AddRun,  &AddStatus, &AddMetrics, &AddSend,
                                &AddTail,  &AddFind, &AddStats,  &AddExport,  &AddBackup,
                                &AddPrune, &AddPage, &AddOutbox, &AddBundle};

} // namespace reportctl::commands
