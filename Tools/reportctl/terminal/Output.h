#pragma once

#include <string>

namespace reportctl::terminal {

/// Writes out what standard output has in its buffer. Call it before a line on standard error, so that the
/// two keep their order when they go to the same place. FinishOutput reports a failure.
void FlushOutput();

/// Writes out what standard output still has in its buffer. Call it at the program's end. Returns `exitCode`.
/// When some of the output could not be written, it prints a line on standard error and returns 1 in place of
/// 0: with a full disk, a script must not take half of an output for the whole. When the reader closed the
/// pipe, it has read enough; that is no failure.
int FinishOutput(int exitCode);

/// Prints the error that ends the program on standard error. Unlike fmt::print, it does not throw when
/// standard error cannot be written to.
void TellLastError(const std::string& text);

} // namespace reportctl::terminal
