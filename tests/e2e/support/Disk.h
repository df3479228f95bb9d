#pragma once

#include <cstdint>
#include <string>

/// A small file system of the test's own, mounted at a directory; it hides what was there and goes with this
/// object. Only in the sandbox. Failure: throws std::system_error.
class Disk {
public:
    Disk(std::string directory, std::uintmax_t bytes);
    ~Disk();
    Disk(const Disk&) = delete;
    Disk& operator=(const Disk&) = delete;

    /// Takes all the room that is left.
    void Fill() const;
    void MakeRoom() const;

    /// No process may write any more. Refused by the kernel while a file is open for writing.
    void ForbidWriting() const;
    void AllowWriting() const;

private:
    void Remount(unsigned long flags) const;
    std::string Filler() const { return m_directory + "/filler"; }

    const std::string m_directory;
};
