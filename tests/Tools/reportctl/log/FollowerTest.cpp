#include "Tools/reportctl/log/Follower.h"

#include <filesystem>
#include <fstream>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Tools/reportctl/log/Files.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

using reportctl::log::Follower;
using reportctl::log::RotatedFiles;
using ::testing::ElementsAre;

class LogFollower : public ::testing::Test {
protected:
    void Append(const std::string& file, const std::string& text) const {
        std::ofstream(Path(file), std::ios::app) << text;
    }

    void Rotate(int number) const {
        std::filesystem::rename(Path("Report.log"), Path("Report_" + std::to_string(number) + ".log"));
    }

    std::string Path(const std::string& file) const { return m_directory.Path() + "/" + file; }
    const std::string& Directory() const { return m_directory.Path(); }

    static std::vector<std::string> All(Follower& follower) {
        std::vector<std::string> lines;
        for (std::string line; follower.Next(line);)
            lines.push_back(line);
        return lines;
    }

private:
    TemporaryDirectory m_directory;
};

TEST_F(LogFollower, ReadsTheRotatedFilesByTheirNumbersAndThenTheLiveOne) {
    Append("Report_10.log", "two\n");
    Append("Report_9.log", "one\n");
    Append("Report_x.log", "no\n");
    Append("Report.log", "three\n");
    Follower follower(Directory(), RotatedFiles(Directory()));
    EXPECT_THAT(All(follower), ElementsAre("one", "two", "three"));
}

TEST_F(LogFollower, WaitsForTheWholeLine) {
    Append("Report.log", "one\ntw");
    Follower follower(Directory(), {});
    EXPECT_THAT(All(follower), ElementsAre("one"));
    Append("Report.log", "o\n");
    EXPECT_THAT(All(follower), ElementsAre("two"));
}

TEST_F(LogFollower, GoesOnAfterRotationsOfWhichItSawNone) {
    Append("Report.log", "one\n");
    Follower follower(Directory(), {});
    EXPECT_THAT(All(follower), ElementsAre("one"));
    Append("Report.log", "two\n");
    Rotate(7);
    Append("Report.log", "three\n");
    Rotate(8);
    Append("Report.log", "four\n");
    EXPECT_THAT(All(follower), ElementsAre("two", "three", "four"));
}

TEST_F(LogFollower, GoesOnAfterARotationThatComesBeforeTheFirstLook) {
    Append("Report_6.log", "not asked for\n");
    Append("Report.log", "one\n");
    Follower follower(Directory(), {});
    Rotate(7);
    Append("Report.log", "two\n");
    Rotate(8);
    Append("Report.log", "three\n");
    EXPECT_THAT(All(follower), ElementsAre("one", "two", "three"));
    EXPECT_THAT(All(follower), ElementsAre());
}

TEST_F(LogFollower, GoesOnWithWhatIsThereAfterAFileThatWasDeletedForTheLogsBound) {
    Append("Report.log", "one\n");
    Follower follower(Directory(), {});
    EXPECT_THAT(All(follower), ElementsAre("one"));
    Rotate(7);
    std::filesystem::remove(Path("Report_7.log"));
    Append("Report.log", "two\n");
    Rotate(8);
    Append("Report.log", "three\n");
    EXPECT_THAT(All(follower), ElementsAre("two", "three"));
    Rotate(9);
    Append("Report.log", "four\n");
    EXPECT_THAT(All(follower), ElementsAre("four"));
}

TEST_F(LogFollower, KeepsNothingOfALineThatIsTooLongForARecord) {
    Append("Report.log", std::string(30 << 20, 'x') + "\none\n");
    Follower follower(Directory(), {});
    const auto lines = All(follower);
    ASSERT_EQ(lines.size(), 2u);
    EXPECT_LT(lines[0].size(), 2u << 20);
    EXPECT_EQ(lines[1], "one");
}

TEST_F(LogFollower, WaitsForALogThatIsNotThereYet) {
    Follower follower(Directory() + "/later", {});
    EXPECT_THAT(All(follower), ElementsAre());
    std::filesystem::create_directory(Path("later"));
    Append("later/Report.log", "one\n");
    EXPECT_THAT(All(follower), ElementsAre("one"));
}

TEST_F(LogFollower, GoesOnWithALogThatWasDeletedOrCut) {
    Append("Report.log", "one\n");
    Follower follower(Directory(), {});
    EXPECT_THAT(All(follower), ElementsAre("one"));
    std::filesystem::remove(Path("Report.log"));
    EXPECT_THAT(All(follower), ElementsAre());
    Append("Report.log", "two, and longer\n");
    EXPECT_THAT(All(follower), ElementsAre("two, and longer"));
    std::filesystem::resize_file(Path("Report.log"), 0);
    EXPECT_THAT(All(follower), ElementsAre());
    Append("Report.log", "three\n");
    EXPECT_THAT(All(follower), ElementsAre("three"));
}

TEST_F(LogFollower, DoesNotWaitForADirectoryOrAPipeInTheLogsPlace) {
    std::filesystem::create_directory(Path("Report.log"));
    Follower follower(Directory(), {});
    EXPECT_THAT(All(follower), ElementsAre());
}

} // namespace
