#pragma once

#include <chrono>

namespace reportctl::terminal {

/// For a command that goes on until it is told to end. While it lives, Ctrl-C and SIGTERM end the command in
/// an orderly way and not the program.
///
/// One at a time, on the main thread.
class Watch {
public:
    Watch();
    ~Watch();
    Watch(const Watch&) = delete;
    Watch& operator=(const Watch&) = delete;

    /// Waits so long. False when the command is to end: by one of the signals, or because the reader of
    /// standard output has closed its end.
    bool Wait(std::chrono::milliseconds time);
};

} // namespace reportctl::terminal
