#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "Modules/BoostLogger/FileFailure.h"

namespace BoostLogger {

struct RotatedFile {
    std::uint64_t number = 0; ///< Rises with every rotation, so it shows the age also when the clock jumps.
    std::int64_t sizeBytes = 0;
};

/// Returns the oldest of `files`, as many as must be deleted so that the others have at most `budgetBytes`.
std::vector<RotatedFile> FilesToDelete(std::vector<RotatedFile> files, std::int64_t budgetBytes);

/// The files Report_1.log, Report_2.log ... beside a live file Report.log.
/// Threads: one at a time. Processes: only the process that holds the live file's lock.
class RotatedFiles {
public:
    RotatedFiles(std::string directory, const std::string& liveName);

    /// Renames the live file to the next number. The numbers rise during the life of the process. They also
    /// rise from process to process, as long as the newest rotated file exists.
    FileFailure TakeIn(const std::string& livePath);

    /// Deletes the oldest files until the others have at most `budgetBytes`. A file that cannot be deleted
    /// stays.
    void Prune(std::int64_t budgetBytes);

    /// The number in the name of a rotated file; nothing for any other name.
    std::optional<std::uint64_t> NumberOf(std::string_view name) const;

private:
    std::vector<RotatedFile> List() const;
    std::string PathOf(std::uint64_t number) const;

    std::string m_directory;
    std::string m_prefix;
    std::string m_suffix;
    std::uint64_t m_lastNumber = 0;
};

} // namespace BoostLogger
