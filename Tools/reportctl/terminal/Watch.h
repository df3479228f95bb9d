#pragma once

#include <chrono>

namespace reportctl::terminal {

/// For a command that runs until a signal ends it. While this object lives, Ctrl-C and SIGTERM do not kill
/// the program: Wait returns false, and the command can end in an orderly way.
///
/// Only one object at a time, on the main thread.
class Watch {
public:
    Watch();
    ~Watch();
    Watch(const Watch&) = delete;
    Watch& operator=(const Watch&) = delete;

    /// Waits for this time. Returns false, also earlier, when the command shall end: after one of the
    /// signals, or when the reader of standard output has closed the pipe.
    bool Wait(std::chrono::milliseconds time);
};

} // namespace reportctl::terminal
