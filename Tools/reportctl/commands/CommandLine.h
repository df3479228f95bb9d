#pragma once

#include <memory>

namespace CLI {
class App;
}

namespace reportctl::commands {

/// The whole command line of reportctl: its commands, --help and --version. The program parses with it; the
/// manual pages and the shells' completions are written from it. `exitCode` must outlive the parsing (see
/// Add).
std::unique_ptr<CLI::App> MakeCommandLine(int& exitCode);

} // namespace reportctl::commands
