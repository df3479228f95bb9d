#pragma once

#include <string>
#include <string_view>

#include <sys/types.h>

namespace reportctl::terminal {

/// Where a command's result goes: standard output, or a file that appears whole or not at all.
///
/// A file is written under another name beside its own, mode 0600 unless another one is asked for, and gets
/// its name in Finish, after its contents are on the disk; one that was there before stays as it is until
/// then, and for good when anything fails. A path that names a device or a pipe is written to as it is.
///
/// Failure: every operation throws std::system_error, a full disk and a full /dev/full included.
class Result {
public:
    /// An empty path, or "-", is standard output.
    explicit Result(const std::string& path, mode_t mode = 0600);
    ~Result();
    Result(const Result&) = delete;
    Result& operator=(const Result&) = delete;

    void Write(std::string_view text);

    /// Hands over what was written so far, for a result that grows while it is read.
    void Flush();

    /// Everything is written when this returns. Without it, nothing of a file is left.
    void Finish();

    bool IsStandardOutput() const { return m_path.empty(); }

private:
    void OpenFile();

    std::string m_path;
    mode_t m_mode;
    std::string m_draft; ///< empty: there is nothing to be renamed or removed
    int m_descriptor = -1;
    std::string m_buffer;
};

} // namespace reportctl::terminal
