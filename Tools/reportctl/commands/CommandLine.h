#pragma once

#include <memory>

namespace CLI {
class App;
}

namespace reportctl::commands {

/// The whole command line of reportctl: its commands, --help and --version. The program parses its arguments
/// with it, and the manual pages and the shells' completions are written from it. `exitCode` must live until
/// the parsing ends (see Add).
std::unique_ptr<CLI::App> MakeCommandLine(int& exitCode);

} // namespace reportctl::commands
