#pragma once

#include <memory>
#include <string>

#include "Tools/reportctl/terminal/Result.h"

struct archive;

namespace reportctl::bundle {

/// Makes a .tar.gz file with mode 0600. It appears whole or not at all (see terminal::Result).
///
/// Failure: throws std::system_error for the file, std::runtime_error for the archive.
class Archive {
public:
    explicit Archive(const std::string& path);

    /// Adds a text file. `name` may begin with a folder.
    void Add(const std::string& name, const std::string& content);

    /// Completes the file. Without this call, no file is left.
    void Finish();

private:
    void Check(int code) const;

    terminal::Result m_file;
    std::unique_ptr<struct archive, int (*)(struct archive*)> m_archive;
};

} // namespace reportctl::bundle
