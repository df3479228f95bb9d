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
/// Life: made or found → locked → checked, and set aside when it is damaged or of another layout → all its
/// blocks allocated → mapped. What is written to the memory survives the end of the process, also a kill, but
/// not a power failure of the machine.
///
/// Failure: Open returns null and removes a file that it made. While the file is mapped, it must not be cut:
/// access to the missing part raises a signal, and no handler for that is installed.
class MappedFile {
public:
    /// Makes what is missing: the directory and its parents with mode 0700, the file with mode 0600. When
    /// another process holds the lock of the file, this waits a tenth of a second at most.
    static std::unique_ptr<MappedFile> Open(const std::string& directory, std::int64_t nowMs);

    ~MappedFile();
    MappedFile(const MappedFile&) = delete;
    MappedFile& operator=(const MappedFile&) = delete;

    /// Valid as long as this object exists.
    File& Content() const { return *m_content; }

private:
    MappedFile(SystemTool::IO::Descriptor file, File* content)
        : m_file(std::move(file)), m_content(content) {}

    SystemTool::IO::Descriptor m_file; ///< Stays open, because closing it releases the lock.
    File* m_content;
};

} // namespace ReportLedger
