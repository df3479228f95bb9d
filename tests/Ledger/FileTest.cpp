#include <cstring>
#include <filesystem>
#include <fstream>

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tests/Ledger/LedgerFixture.h"
#include "tests/e2e/support/Disk.h"
#include "tests/support/ModeOf.h"

using namespace ReportLedger;

// What the ledger does when something happens to its file.

/// When true, mapping memory fails, as it does when no memory is left.
static bool g_noMemoryToMap = false;

extern "C" {
// The linker's option --wrap asks for these names; see CMakeLists.txt.
void* __real_mmap(void* address, std::size_t bytes, int protection, int flags, int file, off_t offset);
void* __wrap_mmap(void* address, std::size_t bytes, int protection, int flags, int file, off_t offset) {
    if (g_noMemoryToMap) {
        errno = ENOMEM;
        return MAP_FAILED;
    }
    return __real_mmap(address, bytes, protection, flags, file, offset);
}
}

namespace {

class LedgerFile : public LedgerFixture {
protected:
    /// Makes a file that counts this many stored reports.
    void MakeFile(int reports) const {
        Writer writer;
        ASSERT_TRUE(Open(writer, NOW_MS - 1000));
        for (int i = 0; i < reports; ++i)
            TakeAndEnd(writer, Outcome::Stored);
    }

    void Overwrite(std::streamoff at, const std::string& bytes) const {
        std::fstream file(Path(), std::ios::in | std::ios::out | std::ios::binary);
        file.seekp(at);
        file << bytes;
    }

    static std::string WordOf(std::uint64_t value) {
        std::string bytes(sizeof value, '\0');
        std::memcpy(bytes.data(), &value, sizeof value);
        return bytes;
    }

    /// Expects that a start made a new file for this reason, and kept the old one beside it.
    void ExpectBegunAnew(Begun begun) const {
        Writer writer;
        ASSERT_TRUE(Open(writer));
        TakeAndEnd(writer, Outcome::Stored);
        const auto look = Look();
        EXPECT_EQ(look.sight, Sight::Sound);
        EXPECT_EQ(look.total[RECEIVED], 1U);
        EXPECT_EQ(look.begun, begun);
        EXPECT_EQ(look.begunAtMs, NOW_MS);
        EXPECT_EQ(std::filesystem::exists(SetAside()), begun != Begun::NoFile);
    }

    /// Expects that a start counts in memory, and does not change what is at the file's place.
    void ExpectCountingInMemory() const {
        Writer writer;
        EXPECT_FALSE(Open(writer));
        TakeAndEnd(writer, Outcome::Stored);
        EXPECT_EQ(LookAt(writer.Content(), true, NOW_MS).total[RECEIVED], 1U);
    }
};

} // namespace

TEST_F(LedgerFile, IsMadeWithItsDirectoriesForItsUserAloneWhateverTheUmask) {
    for (const mode_t mask : {0, 0277, 0777}) {
        const mode_t before = ::umask(mask);
        Writer writer;
        EXPECT_TRUE(Open(writer));
        ::umask(before);
        EXPECT_EQ(ModeOf(m_data.Path() + "/hublink"), 0700U) << mask;
        EXPECT_EQ(ModeOf(Directory()), 0700U) << mask;
        EXPECT_EQ(ModeOf(Path()), 0600U) << mask;
        std::filesystem::remove_all(m_data.Path() + "/hublink");
    }
}

TEST_F(LedgerFile, HasAllItsBlocksFromTheStart) {
    MakeFile(0);
    struct stat status {};
    ASSERT_EQ(::stat(Path().c_str(), &status), 0);
    EXPECT_EQ(status.st_size, off_t{FILE_BYTES});
    EXPECT_GE(status.st_blocks * 512, status.st_size);
}

TEST_F(LedgerFile, IsLaidOutAsItIsDocumented) {
    {
        Writer writer;
        ASSERT_TRUE(Open(writer));
        TakeAndEnd(writer, Outcome::Stored);
    }
    std::ifstream file(Path(), std::ios::binary);
    const std::string content((std::istreambuf_iterator<char>(file)), {});
    const auto word = [&](std::size_t at) {
        std::uint64_t value = 0;
        std::memcpy(&value, &content.at(at), sizeof value);
        return value;
    };
    const auto half = [&](std::size_t at) { return word(at) & 0xffffffffU; };
    ASSERT_EQ(content.size(), 17920U);
    EXPECT_EQ(content.substr(0, 8), "HLLEDGER");
    EXPECT_EQ(half(8), 1U);
    EXPECT_EQ(half(12), 17920U);
    EXPECT_EQ(half(16), 32U);
    EXPECT_EQ(half(20), 60U);
    EXPECT_EQ(half(24), 10U);
    EXPECT_EQ(half(28), 4U);
    EXPECT_EQ(word(32), static_cast<std::uint64_t>(NOW_MS));
    EXPECT_EQ(word(40), 0U);
    EXPECT_EQ(word(48) % 2, 0U);
    EXPECT_EQ(word(56), static_cast<std::uint64_t>(NOW_MS));
    EXPECT_EQ(word(64), static_cast<std::uint64_t>(::getpid()));
    EXPECT_STREQ(&content[72], "1.2.3");
    EXPECT_STREQ(&content[104], "c0ffee");
    EXPECT_EQ(word(256 + 8 * 0), 1U) << "received";
    EXPECT_EQ(word(256 + 8 * 1), 100U) << "its bytes";
    EXPECT_EQ(word(256 + 8 * 8), 1U) << "stored";
    EXPECT_EQ(word(512 + 8 * 8), static_cast<std::uint64_t>(NOW_MS)) << "when";
    EXPECT_EQ(word(768 + 8 * 8), 0U) << "stored before the start";
    EXPECT_EQ(word(1024), static_cast<std::uint64_t>(NOW_MS)) << "the first mark's time";
    EXPECT_EQ(word(1024 + 60 * 264), static_cast<std::uint64_t>(NOW_MS)) << "that of the first of one second";
}

TEST_F(LedgerFile, OfWrongRightsGetsItsOwn) {
    MakeFile(1);
    std::filesystem::permissions(Path(), std::filesystem::perms::all);
    MakeFile(1);
    EXPECT_EQ(ModeOf(Path()), 0600U);
    EXPECT_EQ(Look().total[RECEIVED], 2U);
}

TEST_F(LedgerFile, ThatIsNoLedgerIsSetAside) {
    MakeFile(3);
    Overwrite(0, "something else");
    EXPECT_EQ(Look().sight, Sight::Damaged);
    ExpectBegunAnew(Begun::Damaged);
}

TEST_F(LedgerFile, WhoseCountersContradictEachOtherIsSetAside) {
    MakeFile(3);
    Overwrite(256, WordOf(2)); // the received reports: now fewer than the stored ones
    EXPECT_EQ(Look().sight, Sight::Damaged);
    ExpectBegunAnew(Begun::Damaged);
}

TEST_F(LedgerFile, ThatWasCutBeforeTheStartIsSetAside) {
    for (const off_t size : {off_t{9}, off_t{255}, off_t{4096}, off_t{FILE_BYTES} - 1}) {
        std::filesystem::remove_all(Directory());
        MakeFile(3);
        ASSERT_EQ(::truncate(Path().c_str(), size), 0);
        EXPECT_EQ(Look().sight, Sight::Damaged) << size;
        ExpectBegunAnew(Begun::Damaged);
    }
}

TEST_F(LedgerFile, OfAnotherVersionIsSetAside) {
    MakeFile(3);
    Overwrite(8, std::string("\2\0\0\0", 4));
    EXPECT_EQ(Look().sight, Sight::OtherVersion);
    ExpectBegunAnew(Begun::OtherVersion);
}

TEST_F(LedgerFile, ThatIsSetAsideReplacesTheOneBeforeIt) {
    MakeFile(3);
    for (const std::string damage : {"first", "second"}) {
        Overwrite(0, damage);
        MakeFile(1);
    }
    std::ifstream kept(SetAside(), std::ios::binary);
    std::string beginning(6, '\0');
    kept.read(beginning.data(), 6);
    EXPECT_EQ(beginning, "second");
}

TEST_F(LedgerFile, WhoseMakingWasCutShortIsMadeAgain) {
    MakeFile(3);
    Overwrite(0, std::string(8, '\0')); // no magic number, which is written last
    EXPECT_EQ(Look().sight, Sight::Unfinished);
    ExpectBegunAnew(Begun::NoFile);
    ASSERT_EQ(::truncate(Path().c_str(), 0), 0);
    EXPECT_EQ(Look().sight, Sight::Unfinished);
    ExpectBegunAnew(Begun::NoFile);
}

TEST_F(LedgerFile, BelongsToTheFirstOfTwoProcesses) {
    Writer first;
    ASSERT_TRUE(Open(first));
    TakeAndEnd(first, Outcome::Stored);
    const pid_t second = ::fork();
    if (second == 0) {
        Writer writer;
        const bool opened = Open(writer, NOW_MS + 1000);
        TakeAndEnd(writer, Outcome::Stored);
        ::_exit(opened ? 1 : 0);
    }
    int status = -1;
    ::waitpid(second, &status, 0);
    EXPECT_EQ(status, 0) << "the second one counts in memory";
    EXPECT_EQ(Look().total[RECEIVED], 1U);
    EXPECT_EQ(Look().startedAtMs, NOW_MS);
    EXPECT_TRUE(Look().counting);
}

TEST_F(LedgerFile, TellsWhetherItsProcessLives) {
    MakeFile(1);
    EXPECT_FALSE(Look().counting);
    Writer writer;
    ASSERT_TRUE(Open(writer));
    EXPECT_TRUE(Look().counting);
    EXPECT_TRUE(Look().counting) << "a look takes no lock, and gives none away";
    Writer another;
    EXPECT_FALSE(Open(another));
}

TEST_F(LedgerFile, ThatIsALinkOrAPipeOrADirectoryIsLeftAlone) {
    std::filesystem::create_directories(Directory());
    const std::string elsewhere = m_data.Path() + "/elsewhere";
    std::ofstream(elsewhere) << "mine";
    std::filesystem::create_symlink(elsewhere, Path());
    ExpectCountingInMemory();
    EXPECT_EQ(Look().sight, Sight::Unreadable);
    EXPECT_EQ(std::filesystem::file_size(elsewhere), 4U);

    std::filesystem::remove(Path());
    ASSERT_EQ(::mkfifo(Path().c_str(), 0600), 0);
    ExpectCountingInMemory();
    EXPECT_EQ(Look().sight, Sight::Unreadable);

    std::filesystem::remove(Path());
    std::filesystem::create_directory(Path());
    ExpectCountingInMemory();
    EXPECT_EQ(Look().sight, Sight::Unreadable);
}

TEST_F(LedgerFile, InADirectoryThatCannotBeMadeCostsTheFileOnly) {
    std::ofstream(m_data.Path() + "/hublink") << "in the way";
    ExpectCountingInMemory();
    EXPECT_EQ(Look().sight, Sight::Unreadable) << "a file is where a directory should be";
}

TEST_F(LedgerFile, OnAReadOnlyFileSystemCostsTheFileOnly) {
    const Disk disk(Directory(), 1'000'000);
    MakeFile(3);
    disk.ForbidWriting();
    ExpectCountingInMemory();
    EXPECT_EQ(Look().total[RECEIVED], 3U) << "and can still be read";
    EXPECT_FALSE(Look().counting);
    disk.AllowWriting();
    MakeFile(1);
    EXPECT_EQ(Look().total[RECEIVED], 4U);
}

TEST_F(LedgerFile, OnAFullFileSystemIsNotMade) {
    const Disk disk(Directory(), 1'000'000);
    disk.Fill();
    ExpectCountingInMemory();
    EXPECT_FALSE(std::filesystem::exists(Path()));
    disk.MakeRoom();
    MakeFile(1);
    EXPECT_EQ(Look().total[RECEIVED], 1U);
}

TEST_F(LedgerFile, OnAFileSystemThatHasBecomeFullIsCountedInAsBefore) {
    const Disk disk(Directory(), 1'000'000);
    MakeFile(3);
    disk.Fill();
    MakeFile(3); // also when it is opened on the full disk
    EXPECT_EQ(Look().total[RECEIVED], 6U);
}

TEST_F(LedgerFile, WithoutMemoryToMapCostsTheFileOnly) {
    g_noMemoryToMap = true;
    ExpectCountingInMemory();
    g_noMemoryToMap = false;
    EXPECT_FALSE(std::filesystem::exists(Path())) << "it left none";
    MakeFile(3);
    g_noMemoryToMap = true;
    ExpectCountingInMemory();
    g_noMemoryToMap = false;
    EXPECT_EQ(Look().total[RECEIVED], 3U) << "one that was there is as it was";
}
