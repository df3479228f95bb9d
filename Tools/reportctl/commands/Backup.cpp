#include <filesystem>
#include <memory>
#include <string>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "Tools/reportctl/commands/Commands.h"
#include "Tools/reportctl/store/Copy.h"
#include "Tools/reportctl/store/NewDirectory.h"
#include "Tools/reportctl/store/Paths.h"
#include "Tools/reportctl/store/Store.h"
#include "Tools/reportctl/terminal/Progress.h"

namespace reportctl::commands {
namespace {

namespace fs = std::filesystem;

constexpr auto HELP = "Example:\n"
                      "  reportctl backup ~/report-backup-$(date +%F)\n"
                      "\n"
                      "To go back to it: stop the service, move Report.db, MetrikOutbox.db and their -wal "
                      "and -shm away, copy the two files\n"
                      "of the backup into their place, run `reportctl setup`, start the service. An outbox "
                      "that was restored sends again\n"
                      "what it had sent since; the collector can tell by log.record.uid.\n"
                      "\n";

void Copy(const std::string& from, const std::string& to) {
    {
        terminal::Progress progress("copying " + fs::path(from).filename().string());
        store::Naming(from, [&] {
            store::CopyDatabase(from, to, [&](int done, int total) { progress.Show(done, total); });
        });
    }
    fmt::print("{} ({} bytes)\n", to, fs::file_size(to));
}

void Backup(const std::string& path) {
    store::RequireStore(store::StorePath()); // checked before the directory is made
    store::NewDirectory directory(path);
    Copy(store::StorePath(), path + "/Report.db");
    if (fs::exists(store::OutboxPath()))
        Copy(store::OutboxPath(), path + "/" + store::OUTBOX_FILE);
    else
        fmt::print("No outbox: {} is not there, so it has no events.\n", store::OutboxPath());
    directory.Keep();
}

} // namespace

void AddBackup(CLI::App& app, int& exitCode) {
    auto path = std::make_shared<std::string>();
    auto* command = app.add_subcommand(
        "backup",
        "Copy the store and the outbox into a new directory, while the service goes on. Each is copied as it "
        "is at one moment, and checked. Copying Report.db with cp would leave the newest rows out.");
    command->add_option("DIRECTORY", *path, "The directory to make (mode 0700); it must not exist")
        ->required();
    command->footer(HELP + app.get_footer());
    command->callback([path, &exitCode] {
        Backup(*path);
        exitCode = 0;
    });
}

} // namespace reportctl::commands
