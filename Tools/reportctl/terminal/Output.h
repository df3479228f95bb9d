#pragma once

#include <string>

namespace reportctl::terminal {

/// The last thing that a command does: writes out what standard output still keeps. Returns `exitCode`; or 1
/// in place of 0, after a line on standard error, when some of the output could not be written. A script that
/// reads a full disk's half output must not take it for the whole. A reader that closed its pipe has seen
/// enough, and is no failure.
int FinishOutput(int exitCode);

/// For what ends the program. Unlike fmt::print, it does not throw when standard error cannot be written to
/// either.
void TellLastError(const std::string& text);

} // namespace reportctl::terminal
