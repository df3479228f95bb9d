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

/// A predecessor that is just being killed loses its instance lock a moment before this one.
bool LockSoon(int file) {
    for (int attempt = 1; !Platform::TryLockFile(file); ++attempt) {
        if (attempt == LOCK_ATTEMPTS)
            return false;
        std::this_thread::sleep_for(BETWEEN_ATTEMPTS);
    }
    return true;
}

/// Without waiting for a writer where the name is that of a pipe; no descriptor for anything but a file that
/// can be locked.
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

/// The magic number comes last: a file that a kill left half made has none.
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
    std::atomic_signal_fence(std::memory_order_release); // a kill sees the order of the instructions
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
    } else if (*state == FileState::Unfinished &&
               ::ftruncate(file.Number(), 0) != 0) { // what is left of it, as zeros
        return nullptr;
    }
    if (!file.IsOpen() || ::fchmod(file.Number(), FILE_MODE) != 0)
        return nullptr;
    File* const content = Platform::AllocateFile(file.Number(), FILE_BYTES) ? Map(file.Number()) : nullptr;
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
