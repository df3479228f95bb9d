#pragma once

#include <cstdint>
#include <string>

/// A small file system of the test, mounted at a directory. It hides what was there. The destructor unmounts
/// it. Only in the sandbox. Failure: throws std::system_error.
class Disk {
public:
    Disk(std::string directory, std::uintmax_t bytes);
    ~Disk();
    Disk(const Disk&) = delete;
    Disk& operator=(const Disk&) = delete;

    /// Uses all the room that is left.
    void Fill() const;
    void MakeRoom() const;

    /// Makes the file system read-only. The kernel refuses this while a file is open for writing.
    void ForbidWriting() const;
    void AllowWriting() const;

private:
    void Remount(unsigned long flags) const;
    std::string Filler() const { return m_directory + "/filler"; }

    const std::string m_directory;
};
