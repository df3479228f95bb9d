#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "Modules/BoostLogger/FileFailure.h"

namespace BoostLogger {

struct RotatedFile {
    std::uint64_t number = 0; ///< Rises with every rotation; shows the age, also when the clock jumps.
    std::int64_t sizeBytes = 0;
};

/// Which of `files` to delete so that the others have at most `budgetBytes` together: the oldest.
std::vector<RotatedFile> FilesToDelete(std::vector<RotatedFile> files, std::int64_t budgetBytes);

/// The files Report_1.log, Report_2.log ... beside a live file Report.log.
/// Threads: one at a time. Processes: only the one that holds the live file's lock.
class RotatedFiles {
public:
    RotatedFiles(std::string directory, const std::string& liveName);

    /// Gives the live file the next number. The numbers rise over the life of the process, and beyond it as
    /// long as the youngest rotated file is there.
    FileFailure TakeIn(const std::string& livePath);

    /// Deletes the oldest until the others have at most `budgetBytes`. A file that cannot be deleted is left.
    void Prune(std::int64_t budgetBytes);

    /// The number in the name of a rotated file, none for any other name.
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
