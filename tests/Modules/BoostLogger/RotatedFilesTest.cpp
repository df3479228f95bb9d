#include "Modules/BoostLogger/RotatedFiles.h"

#include <cerrno>

#include <gtest/gtest.h>

#include "tests/Modules/BoostLogger/LogFiles.h"
#include "tests/support/TemporaryDirectory.h"

using BoostLogger::RotatedFile;
using BoostLogger::RotatedFiles;

namespace {

std::vector<std::uint64_t> NumbersToDelete(std::vector<RotatedFile> files, std::int64_t budgetBytes) {
    std::vector<std::uint64_t> numbers;
    for (const RotatedFile& file : BoostLogger::FilesToDelete(std::move(files), budgetBytes))
        numbers.push_back(file.number);
    return numbers;
}

class TheRotatedFiles : public testing::Test {
protected:
    std::filesystem::path At(const std::string& name) const {
        return std::filesystem::path(m_directory.Path()) / name;
    }

    void TakeIn(const std::string& content) {
        WriteFile(At("Report.log"), content);
        ASSERT_FALSE(m_files.TakeIn(At("Report.log").string()));
    }

    TemporaryDirectory m_directory;
    RotatedFiles m_files{m_directory.Path(), "Report.log"};
};

} // namespace

TEST(FilesToDelete, AreTheOldestThatAreTooMuch) {
    const std::vector<RotatedFile> files = {{10, 100}, {9, 100}, {2, 50}, {11, 100}};
    EXPECT_EQ(NumbersToDelete(files, 350), (std::vector<std::uint64_t>{}));
    EXPECT_EQ(NumbersToDelete(files, 349), (std::vector<std::uint64_t>{2}));
    EXPECT_EQ(NumbersToDelete(files, 299), (std::vector<std::uint64_t>{2, 9}));
    EXPECT_EQ(NumbersToDelete(files, 0), (std::vector<std::uint64_t>{2, 9, 10, 11}));
    EXPECT_EQ(NumbersToDelete({}, 0), (std::vector<std::uint64_t>{}));
}

TEST_F(TheRotatedFiles, KnowsItsOwnNames) {
    EXPECT_EQ(m_files.NumberOf("Report_1.log"), 1U);
    EXPECT_EQ(m_files.NumberOf("Report_120.log"), 120U);
    for (const char* name : {"Report.log", "Report_.log", "Report_1.txt", "Report_01.log", "Report_0.log",
                             "Report_-1.log", "Report_1a.log", "xReport_1.log", "Report_1.log.gz",
                             "Report_log", "Report_99999999999999999999.log", "Report_9999999999999999.log"})
        EXPECT_EQ(m_files.NumberOf(name), std::nullopt) << name;
}

TEST_F(TheRotatedFiles, NamesThemselvesAfterAFileWithoutExtension) {
    EXPECT_EQ(RotatedFiles(m_directory.Path(), "trace").NumberOf("trace_7"), 7U);
}

TEST_F(TheRotatedFiles, NumberTheFilesInTheOrderOfRotation) {
    TakeIn("one");
    TakeIn("two");
    EXPECT_EQ(ContentOf(At("Report_1.log")), "one");
    EXPECT_EQ(ContentOf(At("Report_2.log")), "two");
    EXPECT_FALSE(std::filesystem::exists(At("Report.log")));
}

TEST_F(TheRotatedFiles, GoOnWithTheHighestNumberOfAnEarlierRun) {
    WriteFile(At("Report_9.log"), "");
    WriteFile(At("Report_10.log"), "");
    std::filesystem::create_directory(At("Report_12.log")); // not a log file, but its name is taken
    TakeIn("x");
    EXPECT_EQ(ContentOf(At("Report_13.log")), "x");
}

TEST_F(TheRotatedFiles, DoNotUseANumberAgainWhoseFileIsGone) {
    TakeIn("one");
    m_files.Prune(0);
    EXPECT_FALSE(std::filesystem::exists(At("Report_1.log")));
    TakeIn("two");
    EXPECT_EQ(ContentOf(At("Report_2.log")), "two");
}

TEST_F(TheRotatedFiles, LeaveTheFilesOfOthersAlone) {
    WriteFile(At("Report_1.txt"), "other");
    WriteFile(At("Metrik_1.log"), "other");
    TakeIn("one");
    m_files.Prune(0);
    EXPECT_TRUE(std::filesystem::exists(At("Report_1.txt")));
    EXPECT_TRUE(std::filesystem::exists(At("Metrik_1.log")));
}

TEST_F(TheRotatedFiles, SayWhyTheLiveFileCannotBeRotated) {
    const auto failure = m_files.TakeIn(At("Report.log").string());
    EXPECT_EQ(failure.error, ENOENT);
    EXPECT_EQ(failure.Text(), "cannot rotate the file: No such file or directory");
}
