#pragma once

#include <string>
#include <string_view>

#include <sys/types.h>

#include "SystemTool/IO/Descriptor.h"

namespace reportctl::terminal {

/// The output of a command: standard output, or a file that appears whole or not at all.
///
/// A file is first written under another name in the same directory. Finish gives it its own name, after its
/// contents are on the disk. A file that has this name already stays unchanged until then, and it stays when
/// anything fails. A path that names a device or a pipe is opened and written to directly.
///
/// Failure: every operation throws std::system_error, for example when the disk is full.
class Result {
public:
    /// An empty path, or "-", means standard output. `mode`: the mode of the finished file.
    explicit Result(const std::string& path, mode_t mode = 0600);
    ~Result();
    Result(const Result&) = delete;
    Result& operator=(const Result&) = delete;

    void Write(std::string_view text);

    /// Writes out what is in the buffer, for an output that is read while it grows.
    void Flush();

    /// Completes the output: after it returns, everything is written, and a file has its name. Without this
    /// call, the destructor removes the unfinished file.
    void Finish();

    bool IsStandardOutput() const { return m_path.empty(); }

private:
    void OpenFile();

    std::string m_path;
    mode_t m_mode;
    std::string m_draft;               ///< the unfinished file; empty when there is none
    SystemTool::IO::Descriptor m_file; ///< not open for standard output
    std::string m_buffer;
};

} // namespace reportctl::terminal
