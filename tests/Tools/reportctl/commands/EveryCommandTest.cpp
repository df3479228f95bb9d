#include <algorithm>
#include <vector>

#include <gmock/gmock.h>
#include <rapidjson/document.h>
#include <unistd.h>

#include "tests/Modules/MetrikSdk/support/SmallDisk.h"
#include "tests/Tools/reportctl/support/ServiceFilesFixture.h"

// Tests for every command that reads or changes the service's files.

namespace {

using ::testing::AnyOf;
using ::testing::HasSubstr;
using ::testing::Not;

/// The file that a command needs.
enum class Needs { Store, Outbox, Log, Ledger, Nothing };

struct Command {
    std::string arguments;
    Needs needs = Needs::Nothing;
    int exitCode = 0; ///< when everything is right except that no service runs
};

const std::vector<Command> LOOK{
    {"tail --no-follow", Needs::Log},
    {"tail --no-follow --json", Needs::Log},
    {"find B100", Needs::Log},
    {"find B100", Needs::Store},
    {"find B100", Needs::Outbox},
    {"find B100 --json", Needs::Store},
    {"stats", Needs::Store},
    {"stats --by hour --json", Needs::Store},
    {"stats --by module --csv", Needs::Store},
    {"stats --by outcome", Needs::Ledger},
    {"export --format csv", Needs::Store},
    {"export --format jsonl", Needs::Store},
    {"prune --keep-rows 1", Needs::Store},
    {"outbox list", Needs::Outbox},
    {"outbox list --json", Needs::Outbox},
    {"forward --dry-run", Needs::Store},
    {"forward --dry-run --json", Needs::Store},
    {"status", Needs::Nothing, 2},
    {"status --json", Needs::Nothing, 2},
    {"metrics"},
};

const std::vector<Command> CHANGE{
    {"prune --keep-rows 1 --yes", Needs::Store},
    {"outbox retry --all", Needs::Outbox},
    {"outbox purge --dead", Needs::Outbox},
};

/// Commands that write into a file or directory. Its name is the last argument.
const std::vector<Command> WRITE{
    {"export --output ", Needs::Store},
    {"backup ", Needs::Store},
    {"bundle "},
    {"page "},
    {"metrics --output "},
};

std::vector<Command> All(const std::string& file) {
    auto all = LOOK;
    all.insert(all.end(), CHANGE.begin(), CHANGE.end());
    for (auto command : WRITE) {
        command.arguments += file;
        all.push_back(command);
    }
    return all;
}

bool IsJson(const std::string& text) {
    return !rapidjson::Document().Parse<rapidjson::kParseValidateEncodingFlag>(text.c_str()).HasParseError();
}

/// Whether the text has a character, line feeds excepted, that a terminal may take for an order: a control
/// byte, or a control character in UTF-8.
bool HasControlCharacter(const std::string& text) {
    for (std::size_t i = 0; i < text.size(); ++i) {
        const auto byte = static_cast<unsigned char>(text[i]);
        const auto next = static_cast<unsigned char>(i + 1 < text.size() ? text[i + 1] : 0);
        if ((byte < 0x20 && byte != '\n') || byte == 0x7f || (byte == 0xc2 && next < 0xa0))
            return true;
    }
    return false;
}

class EveryCommand : public ServiceFilesFixture {
protected:
    /// A collector, for the commands that need one. No program listens there.
    EveryCommand() { ::setenv("OTEL_EXPORTER_OTLP_ENDPOINT", "http://127.0.0.1:1", 1); }
    ~EveryCommand() override { ::unsetenv("OTEL_EXPORTER_OTLP_ENDPOINT"); }

    std::string File() const { return Data() + "/written"; }

    /// The path of what the command needs; empty for a command that needs nothing.
    std::string PathOf(Needs needs) const {
        return needs == Needs::Nothing ? "" : Files()[static_cast<std::size_t>(needs)];
    }

    /// Expects that a command which needs a file fails and names the file, followed by one of these words.
    /// Expects that the other commands succeed.
    void ExpectWords(const Command& command, const Outcome& outcome,
                     const std::vector<std::string>& words) const {
        const auto path = PathOf(command.needs);
        EXPECT_EQ(outcome.exitCode, path.empty() ? command.exitCode : 1) << command.arguments;
        EXPECT_TRUE(path.empty() || std::any_of(words.begin(), words.end(),
                                                [&](const auto& word) { return outcome.Says(path + word); }))
            << command.arguments << ": " << outcome.output;
        std::filesystem::remove_all(File());
    }

    /// A shell text that makes descriptor 4 a pipe without a reader.
    std::string ClosedPipe() const {
        const auto pipe = "'" + Data() + "/pipe'";
        return "{ mkfifo " + pipe + "; exec 3<>" + pipe + " 4>" + pipe + " 3<&-; rm " + pipe + ";";
    }
};

TEST_F(EveryCommand, EndsQuietlyWhenItsReaderHasGone) {
    auto commands = All(File());
    commands.push_back({"tail"});
    commands.push_back({"status --watch 0.1"});
    for (const auto& command : commands) {
        const auto outcome = Reportctl(command.arguments + " >&4; }", ClosedPipe());
        constexpr int BY_SIGPIPE = 128 + 13;
        EXPECT_THAT(outcome.exitCode, AnyOf(command.exitCode, BY_SIGPIPE)) << command.arguments;
        EXPECT_THAT(outcome.output, Not(HasSubstr("error"))) << command.arguments;
        std::filesystem::remove_all(File());
    }
}

TEST_F(EveryCommand, WaitsBetweenTwoLooksAlsoWhereNoTimeIsGiven) {
    const auto text = OutputOf("status --watch", "timeout --signal=INT 1 env");
    EXPECT_EQ(text.find("verdict"), text.rfind("verdict")) << "it looked more than once in a second";
    EXPECT_NE(text, "");
}

TEST_F(EveryCommand, SaysThatWhatItPrintsCannotBeWritten) {
    auto commands = LOOK;
    commands.insert(commands.end(), CHANGE.begin(), CHANGE.end());
    commands.push_back({"outbox test"});
    for (const auto& command : commands) {
        const auto outcome = Reportctl(command.arguments + " >/dev/full; }", "{");
        EXPECT_NE(outcome.exitCode, 0) << command.arguments;
        EXPECT_EQ(outcome.output, "error: cannot write to standard output: No space left on device\n")
            << command.arguments;
    }
}

TEST_F(EveryCommand, LeavesNoHalfFileOnAFullDisk) {
    const auto directory = Data() + "/small";
    std::filesystem::create_directory(directory);
    const auto result = RunOnSmallDisk(directory, 1 << 20, [&] {
        std::ofstream(directory + "/filler") << std::string(2 << 20, 'x');
        for (const auto& command : WRITE) {
            const auto outcome = Reportctl(command.arguments + directory + "/written");
            EXPECT_EQ(outcome.exitCode, 1) << command.arguments;
            EXPECT_THAT(outcome.output,
                        AnyOf(HasSubstr("cannot write " + directory + "/written: No space left"),
                              HasSubstr(Store() + ": database or disk is full")))
                << command.arguments;
            EXPECT_EQ(std::distance(std::filesystem::directory_iterator(directory), {}), 1)
                << command.arguments;
        }
    });
    if (result == SmallDiskResult::Unavailable)
        GTEST_SKIP() << "this machine does not allow mounting";
    EXPECT_EQ(result, SmallDiskResult::Passed);
}

TEST_F(EveryCommand, ReadsTheDatabasesOnAFullDiskAndDoesThemNoHarm) {
    const auto directory = Data() + "/hublink";
    std::filesystem::rename(directory, directory + "-before");
    std::filesystem::create_directory(directory);
    const auto result = RunOnSmallDisk(directory, 2 << 20, [&] {
        std::filesystem::copy(directory + "-before", directory, std::filesystem::copy_options::recursive);
        RemoveSideFiles(); // they cannot be made on the full disk
        std::ofstream(directory + "/filler") << std::string(4 << 20, 'x');
        for (const auto& command : LOOK)
            EXPECT_EQ(Reportctl(command.arguments).exitCode, command.exitCode) << command.arguments;
        for (const auto& command : CHANGE) {
            const auto outcome = Reportctl(command.arguments);
            EXPECT_EQ(outcome.exitCode, 1) << command.arguments;
            EXPECT_THAT(outcome.output, HasSubstr("error: " + PathOf(command.needs) + ": "))
                << command.arguments;
        }
        std::filesystem::remove(directory + "/filler");
        EXPECT_EQ(Ask("select count(*) from OperLog"), "21");
        EXPECT_EQ(Ask("pragma integrity_check"), "ok");
    });
    if (result == SmallDiskResult::Unavailable)
        GTEST_SKIP() << "this machine does not allow mounting";
    EXPECT_EQ(result, SmallDiskResult::Passed);
}

TEST_F(EveryCommand, SaysWhatIsMissing) {
    for (const auto& file : Files())
        std::filesystem::remove(file);
    RemoveSideFiles();
    for (const auto& command : All(File())) {
        // When there is no outbox, no event was ever stored, so this is no error.
        if (command.needs == Needs::Outbox &&
            (command.arguments == "find B100" || command.arguments.starts_with("outbox list")))
            continue;
        ExpectWords(command, Reportctl(command.arguments),
                    {" is missing", ": No such file or directory", " cannot be read"});
    }
    EXPECT_FALSE(std::filesystem::exists(Store()));
}

TEST_F(EveryCommand, SaysWhatIsNoDatabaseAndLeavesItAsItIs) {
    RemoveSideFiles();
    for (const auto& file : {Store(), Outbox(), Ledger()})
        std::ofstream(file, std::ios::trunc) << "no database: " << std::string(20'000, 'x');
    std::filesystem::remove(Log());
    std::filesystem::create_directory(Log());
    const auto before = Everything();
    for (const auto& command : All(File()))
        ExpectWords(command, Reportctl(command.arguments),
                    {": file is not a database", ": it is no file", " cannot be read"});
    EXPECT_EQ(Everything(), before);
}

TEST_F(EveryCommand, SaysWhichDatabaseIsDamagedInside) {
    for (const auto& database : {Store(), Outbox()}) {
        SQLite::Database(database, SQLite::OPEN_READWRITE).exec("pragma wal_checkpoint(truncate)");
        std::fstream file(database, std::ios::in | std::ios::out | std::ios::binary);
        file.seekp(4096);
        file << std::string(std::filesystem::file_size(database) - 4096, '\xa5');
    }
    RemoveSideFiles();
    for (const auto& command : All(File()))
        if (command.needs != Needs::Log && command.needs != Needs::Ledger)
            ExpectWords(command, Reportctl(command.arguments),
                        {": database disk image is malformed", " is damaged: "});
}

TEST_F(EveryCommand, SaysWhatItMayNotRead) {
    if (::geteuid() != 0)
        GTEST_SKIP() << "only root can become another user";
    const auto shared = std::filesystem::path(Data()).parent_path();
    const auto program = shared / "reportctl";
    // The build tree may be in a directory that only its owner can enter.
    std::filesystem::copy_file(REPORTCTL, program);
    for (const auto& directory : {shared, std::filesystem::path(Data())})
        std::filesystem::permissions(directory, std::filesystem::perms(0777));
    for (const auto& command : All(File()))
        ExpectWords(command,
                    Run("setpriv --reuid 65534 --regid 65534 --clear-groups env XDG_DATA_HOME='" + Data() +
                        "' '" + program.string() + "' " + command.arguments),
                    {": Permission denied", " cannot be read"});
}

TEST_F(EveryCommand, ShowsNoTextOfOthersToTheTerminalAsItIs) {
    for (const auto& command : LOOK) {
        if (command.arguments.starts_with("export")) // it copies texts, byte for byte
            continue;
        SCOPED_TRACE(command.arguments);
        const auto text = OutputOf(command.arguments);
        EXPECT_FALSE(HasControlCharacter(text)) << text;
        EXPECT_NE(text, "");
    }
}

TEST_F(EveryCommand, WritesJsonWhateverTheTextsHold) {
    for (const auto* command : {"find B100 --json", "stats --json", "outbox list --json", "status --json"})
        EXPECT_TRUE(IsJson(OutputOf(command))) << command;
    for (const auto* command : {"tail --no-follow --json", "export --format jsonl"}) {
        std::istringstream lines(OutputOf(command));
        int count = 0;
        for (std::string line; std::getline(lines, line); ++count)
            EXPECT_TRUE(IsJson(line)) << command << ": " << line;
        EXPECT_GE(count, 3) << command;
    }
}

} // namespace
