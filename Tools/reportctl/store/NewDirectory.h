#pragma once

#include <string>

namespace reportctl::store {

/// A directory that must not exist before, with mode 0700. The destructor removes it with everything in it,
/// unless Keep was called. Failure: std::system_error that names the directory.
class NewDirectory {
public:
    explicit NewDirectory(std::string path);
    ~NewDirectory();
    NewDirectory(const NewDirectory&) = delete;
    NewDirectory& operator=(const NewDirectory&) = delete;

    /// Writes everything in the directory to the disk. From then on, the destructor keeps the directory.
    void Keep();

private:
    std::string m_path;
    bool m_isKept = false;
};

} // namespace reportctl::store
