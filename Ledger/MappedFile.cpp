#include "Ledger/MappedFile.h"

#include <chrono>
#include <cstdio>
#include <optional>
#include <thread>
#include <utility>

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include "Ledger/FileState.h"
#include "SystemTool/IO/MakeDirectories.h"
#include "SystemTool/Platform.h"

namespace ReportLedger {
namespace {

namespace Platform = SystemTool::Platform;
using SystemTool::IO::Descriptor;

constexpr mode_t FILE_MODE = 0600;
constexpr int LOCK_ATTEMPTS = 20;
constexpr auto BETWEEN_ATTEMPTS = std::chrono::milliseconds(5);

/// Tries for a short time: a previous process that is being killed loses its instance lock a moment before it
/// loses this lock.
bool LockSoon(int file) {
    for (int attempt = 1; !Platform::TryLockFile(file); ++attempt) {
        if (attempt == LOCK_ATTEMPTS)
            return false;
        std::this_thread::sleep_for(BETWEEN_ATTEMPTS);
    }
    return true;
}

/// Opens and locks the file. Does not wait when the path is a pipe. Gives no descriptor for anything that is
/// not a regular file, or that cannot be locked.
Descriptor OpenAndLock(const std::string& path, int flags) {
    Descriptor file(::open(path.c_str(), O_RDWR | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC | flags, FILE_MODE));
    struct stat status {};
    if (file.IsOpen() && ::fstat(file.Number(), &status) == 0 && S_ISREG(status.st_mode) &&
        LockSoon(file.Number()))
        return file;
    return {};
}

File* Map(int file) {
    void* const memory = ::mmap(nullptr, FILE_BYTES, PROT_READ | PROT_WRITE, MAP_SHARED, file, 0);
    return memory == MAP_FAILED ? nullptr : static_cast<File*>(memory);
}

/// Writes the magic number last, so that a file whose making was interrupted by a kill has none.
void BeginCounting(File& content, Begun begun, std::int64_t nowMs) {
    Header& header = content.header;
    header.version = VERSION;
    header.fileBytes = FILE_BYTES;
    header.counters = COUNTERS;
    header.marks = MARKS;
    header.markSeconds = MARK_SECONDS;
    header.recentMarks = RECENT_MARKS;
    header.begunAtMs = nowMs;
    header.begun = begun;
    // The compiler must keep this order, because a kill may come between.
    std::atomic_signal_fence(std::memory_order_release);
    header.magic = MAGIC;
}

} // namespace

std::unique_ptr<MappedFile> MappedFile::Open(const std::string& directory, std::int64_t nowMs) {
    const std::string path = directory + "/" + FILE_NAME;
    if (SystemTool::IO::MakeDirectories(directory))
        return nullptr;
    Descriptor file = OpenAndLock(path, O_CREAT);
    auto state = file.IsOpen() ? StateOf(file.Number()) : std::nullopt;
    if (!state)
        return nullptr;
    auto begun = Begun::NoFile;
    if (*state == FileState::Damaged || *state == FileState::OtherVersion) {
        begun = *state == FileState::Damaged ? Begun::Damaged : Begun::OtherVersion;
        if (::rename(path.c_str(), (path + SET_ASIDE_SUFFIX).c_str()) != 0)
            return nullptr;
        file = OpenAndLock(path, O_CREAT | O_EXCL);
        state = FileState::Unfinished;
    } else if (*state == FileState::Unfinished && ::ftruncate(file.Number(), 0) != 0) {
        return nullptr; // the bytes of an interrupted process could not be removed
    }
    if (!file.IsOpen())
        return nullptr;
    const bool isWhole =
        ::fchmod(file.Number(), FILE_MODE) == 0 && Platform::AllocateFile(file.Number(), FILE_BYTES);
    File* const content = isWhole ? Map(file.Number()) : nullptr;
    if (content == nullptr) {
        if (*state == FileState::Unfinished)
            ::unlink(path.c_str());
        return nullptr;
    }
    if (*state == FileState::Unfinished)
        BeginCounting(*content, begun, nowMs);
    return std::unique_ptr<MappedFile>(new MappedFile(std::move(file), content));
}

MappedFile::~MappedFile() {
    ::munmap(m_content, FILE_BYTES);
}

} // namespace ReportLedger
