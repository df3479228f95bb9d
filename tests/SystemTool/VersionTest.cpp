#include "SystemTool/Version.h"

#include <cstdio>
#include <filesystem>
#include <fstream>

#include <gmock/gmock.h>

#include "tests/support/TemporaryDirectory.h"

using SystemTool::Version::BuildId;
using SystemTool::Version::Number;
using SystemTool::Version::Of;

namespace {

const std::string THIS_PROGRAM = std::filesystem::read_symlink("/proc/self/exe").string();

/// The build id that readelf finds in this program.
std::string BuildIdByReadelf() {
    FILE* const tool = ::popen(("readelf -n " + THIS_PROGRAM + " | sed -n 's/ *Build ID: //p'").c_str(), "r");
    std::string id(200, '\0');
    id.resize(std::fread(id.data(), 1, id.size(), tool));
    ::pclose(tool);
    return id.substr(0, id.find('\n'));
}

void CutTo(const std::string& file, std::uintmax_t bytes) {
    std::filesystem::copy_file(THIS_PROGRAM, file, std::filesystem::copy_options::overwrite_existing);
    std::filesystem::resize_file(file, bytes);
}

} // namespace

TEST(Version, IsThreeNumbers) {
    EXPECT_THAT(Number(), testing::MatchesRegex("[0-9]+\\.[0-9]+\\.[0-9]+"));
}

TEST(Version, StandsInTheProgramsFile) {
    EXPECT_EQ(Of(THIS_PROGRAM).version, Number());
}

TEST(BuildId, IsTheLinkers) {
    EXPECT_THAT(BuildIdByReadelf(), testing::SizeIs(40));
    EXPECT_EQ(BuildId(), BuildIdByReadelf());
}

TEST(Version, OfAFileThatIsMissingOrNoProgramIsNotKnown) {
    const TemporaryDirectory directory;
    const auto text = directory.Path() + "/text";
    std::ofstream(text) << "a text of more bytes than a program's header has, which begins with other bytes";
    for (const auto& file : {directory.Path() + "/missing", text, directory.Path()}) {
        EXPECT_EQ(Of(file).version, "") << file;
        EXPECT_EQ(Of(file).buildId, "") << file;
    }
}

TEST(Version, OfAProgramThatWasCutIsReadAsFarAsItGoes) {
    const TemporaryDirectory directory;
    const auto file = directory.Path() + "/cut";
    for (const std::uintmax_t bytes : {0, 3, 40, 64, 100, 400, 700, 800, 900}) {
        CutTo(file, bytes);
        const auto program = Of(file);
        EXPECT_TRUE(program.version.empty() || program.version == Number()) << bytes;
        EXPECT_TRUE(program.buildId.empty() || program.buildId == BuildId()) << bytes;
    }
    CutTo(file, std::filesystem::file_size(THIS_PROGRAM));
    EXPECT_EQ(Of(file).buildId, BuildId());
}
