#include <filesystem>
#include <ostream>
#include <set>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/e2e/support/HostileDatagrams.h"
#include "tests/e2e/support/HostileFixture.h"

// Datagrams that any user of the machine may send. The service must go on, write only its own files and take
// the next report.

namespace {

struct Barrage {
    const char* name;
    Hostile::Datagrams (*datagrams)();
    int rows;   ///< The rows that it adds to the store; ALL when each datagram adds one.
    int events; ///< The events that it adds to the outbox.
};
constexpr int ALL = -1;

void PrintTo(const Barrage& barrage, std::ostream* out) {
    *out << barrage.name;
}

// A product is the number of texts times the number of valid reports that each text gives, because each text
// is put into every field.
const Barrage BARRAGES[] = {
    {"OpeningBrackets", Hostile::Brackets, 0, 0},
    {"DeepNesting", Hostile::DeepNesting, 0, 0},
    {"NestingAtTheLimit", Hostile::NestingAtTheLimit, 1, 1},
    {"InvalidUtf8", Hostile::InvalidUtf8, 0, 0},
    // A zero character ends a statement, but not the JSON within one.
    {"ZeroCharacters", Hostile::ZeroCharacters, 3 * 3, 3 * 9},
    {"HugeNumbers", Hostile::HugeNumbers, 0, 0},
    {"NumbersThatVanish", Hostile::NumbersThatVanish, 4 * 4, 4 * 3},
    {"DuplicateAndEmptyKeys", Hostile::DuplicateAndEmptyKeys, 5, 0},
    {"LongestDatagrams", Hostile::LongestDatagrams, 0, 0},
    {"Directives", Hostile::Directives, 0, 0},
    {"DirectivesInReports", Hostile::DirectivesInReports, ALL, 0},
    {"ForgedRecords", Hostile::ForgedRecords, 0, 0},
    {"EscapedForgedRecords", Hostile::EscapedForgedRecords, 4 * 6, 4 * 9},
    {"TerminalEscapes", Hostile::TerminalEscapes, 8 * 6, 8 * 9},
    {"Sql", Hostile::Sql, 25 * 2, 25 * 9}, // the day mark, and a member that is not read, are in no statement
    {"SqlThatFits", Hostile::SqlThatFits, ALL, 0},
};

/// Paths of database directories, all of them where every user of the machine may write.
std::vector<std::string> HostilePaths(const std::string& elsewhere) {
    return {elsewhere + "/honest",
            elsewhere + "/a/../b/./c//",
            elsewhere + "/" + std::string(300, 'n'),
            elsewhere + std::string(100, '/') + "many",
            elsewhere + "/control\\u0007\\n",
            elsewhere + "/directives%s%n%1%",
            elsewhere + "/zero\\u0000",
            "",
            "..",
            "../../../../../../../../",
            "relative/",
            "~/",
            "file:" + elsewhere + "/uri?mode=memory&",
            ":memory:",
            "/proc/self/",
            "/dev/null/",
            "/proc/sys/kernel/"};
}

std::string Announcement(const std::string& module, const std::string& dbPath, const std::string& elsewhere) {
    return R"({"msgType":"init","exdata":{"moduleID":")" + module + R"(","logPath":")" + elsewhere +
           R"(/log","dbPath":")" + dbPath + "\"}}";
}

class HostileModule : public HostileFixture {
protected:
    /// Expects that nothing was made in this directory or in the root directory.
    void ExpectNothingIn(const std::string& elsewhere) {
        EXPECT_TRUE(std::filesystem::is_empty(elsewhere));
        EXPECT_EQ(EntriesOfTheRoot(), m_root);
    }

private:
    /// A relative path with enough ".." leads to the root directory.
    static std::set<std::string> EntriesOfTheRoot() {
        std::set<std::string> names;
        for (const auto& entry : std::filesystem::directory_iterator("/"))
            names.insert(entry.path().filename());
        return names;
    }

    const std::set<std::string> m_root = EntriesOfTheRoot();
};

class HostileDatagram : public HostileFixture, public ::testing::WithParamInterface<Barrage> {};

} // namespace

TEST_P(HostileDatagram, LeavesTheServiceSoundAndTheNextReportIsStored) {
    const auto datagrams = GetParam().datagrams();
    for (const auto& datagram : datagrams)
        Send(datagram);
    ExpectSoundness(GetParam().rows == ALL ? static_cast<int>(datagrams.size()) : GetParam().rows,
                    GetParam().events);
}

INSTANTIATE_TEST_SUITE_P(Of, HostileDatagram, ::testing::ValuesIn(BARRAGES),
                         [](const auto& barrage) { return std::string(barrage.param.name); });

TEST_F(HostileModule, TenThousandOfThemWithOthersDirectoriesShareTheOneOutbox) {
    const TemporaryDirectory elsewhere;
    const auto paths = HostilePaths(elsewhere.Path());
    constexpr std::size_t MODULES = 10'000;
    for (std::size_t i = 0; i < MODULES; ++i)
        Send(Announcement("AM" + std::to_string(i), paths[i % paths.size()] + std::to_string(i),
                          elsewhere.Path()));
    for (const std::size_t i : {std::size_t{0}, std::size_t{1}, MODULES - 1})
        Send(R"({"eventID":"AM)" + std::to_string(i) + R"(|1"})");
    ExpectSoundness(0, 3);
    EXPECT_TRUE(m_service.AwaitLines("Metrik/MetrikMgr:41 AddWorker", MODULES + 1)) << "with the default one";
    const auto told = m_service.LogLines("Metrik/MetrikWorker:21 FailCallBackFun");
    ASSERT_EQ(told.size(), 1U);
    EXPECT_EQ(told[0].message,
              "directory-The directory " + elsewhere.Path() +
                  "/honest0 is not used: /tmp may be written by other users; the module uses the "
                  "first outbox");
    ExpectNothingIn(elsewhere.Path());
}
