#include "SystemTool/Version.h"

#include "tests/Tools/reportctl/support/ReportctlFixture.h"

using SystemTool::Version::Of;

namespace {

class Version : public ReportctlFixture {
protected:
    static std::string Described(const std::string& name, const std::string& file) {
        return name + " " + SystemTool::Version::Number() + " (build " + Of(file).buildId + ")";
    }
};

TEST_F(Version, IsToldForReportctlAndForTheServiceWithTheBuildOfEach) {
    const auto service = std::filesystem::path(REPORTCTL).parent_path() / "SyncServiceReport";
    const auto outcome = Reportctl("--version");
    EXPECT_EQ(outcome.exitCode, 0);
    EXPECT_EQ(outcome.output, Described("reportctl", REPORTCTL) + "\n" +
                                  Described("SyncServiceReport", service) + ", " + service.string() + "\n");
}

TEST_F(Version, SaysWhenTheServiceIsMissing) {
    const TemporaryDirectory alone;
    const auto copy = alone.Path() + "/reportctl";
    std::filesystem::copy_file(REPORTCTL, copy);
    EXPECT_EQ(Run(copy + " --version").output,
              Described("reportctl", REPORTCTL) + "\nSyncServiceReport is not installed beside reportctl\n");
}

} // namespace
