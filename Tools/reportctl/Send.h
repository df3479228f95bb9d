#pragma once

namespace CLI {
class App;
}

namespace reportctl {

/// Adds the command `send` to the command line: one report or control message from flags, or many from a file
/// or standard input. When it was given, parsing runs it and puts the program's exit code into `exitCode`,
/// which must outlive `app`'s parsing.
void AddSend(CLI::App& app, int& exitCode);

} // namespace reportctl
