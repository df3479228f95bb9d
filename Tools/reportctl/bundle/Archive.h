#pragma once

#include <memory>
#include <string>

#include "Tools/reportctl/terminal/Result.h"

struct archive;

namespace reportctl::bundle {

/// A .tar.gz file that is made: it appears whole, mode 0600, or not at all (see terminal::Result).
///
/// Failure: throws std::system_error for the file, std::runtime_error for the archive.
class Archive {
public:
    explicit Archive(const std::string& path);

    /// Adds a text file; `name` may have a folder.
    void Add(const std::string& name, const std::string& content);

    void Finish();

private:
    void Check(int code) const;

    terminal::Result m_file;
    std::unique_ptr<struct archive, int (*)(struct archive*)> m_archive;
};

} // namespace reportctl::bundle
