#include "Ledger/FileState.h"

#include <memory>

#include <sys/stat.h>
#include <unistd.h>

#include "Ledger/Counts.h"

namespace ReportLedger {

FileState Judge(const File& content, std::size_t bytes) {
    const Header& header = content.header;
    if (bytes == 0 || header.magic == std::array<char, 8>{})
        return FileState::Unfinished;
    if (bytes < sizeof header || header.magic != MAGIC)
        return FileState::Damaged;
    if (header.version != VERSION)
        return FileState::OtherVersion;
    const Counts total = CopyOf(content.total);
    const bool fits = bytes == FILE_BYTES && header.fileBytes == FILE_BYTES && header.counters == COUNTERS &&
                      header.marks == MARKS && header.markSeconds == MARK_SECONDS &&
                      header.recentMarks == RECENT_MARKS;
    // A datagram is counted as received before it is counted as anything else. So a sound file cannot have
    // fewer received datagrams than ended and lost ones.
    return fits && total[RECEIVED] >= EndedIn(total) + total[LOST_AT_ENDS] ? FileState::Sound
                                                                           : FileState::Damaged;
}

std::optional<FileState> StateOf(int file) {
    struct stat status {};
    const auto content = std::make_unique<File>();
    if (::fstat(file, &status) != 0 || ::pread(file, static_cast<void*>(content.get()), FILE_BYTES, 0) < 0)
        return std::nullopt;
    return Judge(*content, static_cast<std::size_t>(status.st_size));
}

} // namespace ReportLedger
