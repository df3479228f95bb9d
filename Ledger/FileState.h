#pragma once

#include <cstddef>
#include <optional>

#include "Ledger/Layout.h"

namespace ReportLedger {

/// What can be told of a file's content before anything in it is believed.
enum class FileState {
    Sound,
    Unfinished,   ///< Nothing is lost with it: its making was cut short.
    OtherVersion, ///< Of a layout that this program does not know.
    Damaged,      ///< Cut, or overwritten, or its counters contradict each other.
};

/// Judges a file of `bytes` bytes, of which `content` holds as many as it can.
FileState Judge(const File& content, std::size_t bytes);

/// Of an open file; nothing when it cannot be read. One that is written meanwhile may seem damaged.
std::optional<FileState> StateOf(int file);

} // namespace ReportLedger
