#pragma once

#include <cstddef>
#include <optional>

#include "Ledger/Layout.h"

namespace ReportLedger {

/// What a check of a file's content says. It is made before anything in the content is used.
enum class FileState {
    Sound,
    Unfinished,   ///< Its making was interrupted, so it holds no counts yet.
    OtherVersion, ///< Has a layout that this program does not know.
    Damaged,      ///< Cut or overwritten, or its counters contradict each other.
};

/// Checks a file that is `bytes` bytes long. `content` holds the beginning of the file.
FileState Judge(const File& content, std::size_t bytes);

/// The state of an open file; nothing when it cannot be read. A file that is written meanwhile may seem
/// damaged.
std::optional<FileState> StateOf(int file);

} // namespace ReportLedger
