#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <utility>

#include "Ledger/Layout.h"
#include "SystemTool/IO/Descriptor.h"

namespace ReportLedger {

/// The ledger's file, open for counting.
///
/// Life: made or found → locked → judged, and set aside when it makes no sense → all its blocks allocated →
/// mapped. What is written to the memory survives the process's end, however that comes, but not a power
/// failure of the machine.
///
/// Failure: Open gives nothing, and leaves no file that it made itself. No signal is handled: the file must
/// not be cut while it is mapped.
class MappedFile {
public:
    /// Makes what is missing: the directory and its parents with mode 0700, the file with 0600. When another
    /// process has the file, it waits a tenth of a second for it, no longer.
    static std::unique_ptr<MappedFile> Open(const std::string& directory, std::int64_t nowMs);

    ~MappedFile();
    MappedFile(const MappedFile&) = delete;
    MappedFile& operator=(const MappedFile&) = delete;

    /// Valid as long as this object.
    File& Content() const { return *m_content; }

private:
    MappedFile(SystemTool::IO::Descriptor file, File* content)
        : m_file(std::move(file)), m_content(content) {}

    SystemTool::IO::Descriptor m_file; ///< Stays open for its lock.
    File* m_content;
};

} // namespace ReportLedger
