#include <cstdlib>
#include <memory>
#include <string>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "Tools/reportctl/bundle/Archive.h"
#include "Tools/reportctl/bundle/Parts.h"
#include "Tools/reportctl/bundle/Redaction.h"
#include "Tools/reportctl/commands/Commands.h"

namespace reportctl::commands {
namespace {

constexpr auto HELP =
    "Examples:\n"
    "  reportctl bundle ~/report-support.tar.gz\n"
    "  tar -xzOf ~/report-support.tar.gz reportctl-bundle/log.txt | less    # look before you send it\n"
    "\n"
    "Values of reports, open ids and the path of the home directory are taken out; event ids and the names "
    "of "
    "modules stay.\n"
    "A part that cannot be read says why in its place.\n"
    "\n";

struct BundleOptions {
    std::string path;
    bool withValues = false;
};

std::string Home() {
    const char* home = std::getenv("HOME"); // NOLINT(concurrency-mt-unsafe): this program has one thread
    return home == nullptr ? "" : home;
}

std::string ContentOf(const bundle::Part& part, const bundle::Redaction& redaction) {
    try {
        return part.content();
    } catch (const std::exception& error) {
        return redaction.OfText(fmt::format("could not be read: {}\n", error.what()));
    }
}

void WriteBundle(const BundleOptions& options) {
    const bundle::Redaction redaction(options.withValues, Home());
    bundle::Archive archive(options.path);
    std::string list;
    for (const auto& part : bundle::AllParts(redaction)) {
        const auto content = ContentOf(part, redaction);
        archive.Add("reportctl-bundle/" + part.name, content);
        list += fmt::format("{:<18} {:>9} bytes  {}\n", part.name, content.size(), part.about);
    }
    archive.Finish();
    fmt::print("{}{}: {}\n", list, options.path,
               options.withValues
                   ? "with the values of reports and the open ids: send it to no one who may not see them"
                   : "without values of reports, open ids and the home directory's path");
}

} // namespace

void AddBundle(CLI::App& app, int& exitCode) {
    auto options = std::make_shared<BundleOptions>();
    auto* command = app.add_subcommand("bundle", "Write one file for support: what the service says of "
                                                 "itself, the system, the last lines of the log.");
    command->add_option("FILE", options->path, "The file to write, such as support.tar.gz (mode 0600)")
        ->required();
    command->add_flag("--with-values", options->withValues, "Leave values, open ids and paths as they are");
    command->footer(HELP + app.get_footer());
    command->callback([options, &exitCode] {
        WriteBundle(*options);
        exitCode = 0;
    });
}

} // namespace reportctl::commands
