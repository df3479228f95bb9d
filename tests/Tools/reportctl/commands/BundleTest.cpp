#include <algorithm>

#include "tests/Tools/reportctl/support/RowsFixture.h"

namespace {

class BundleCommand : public RowsFixture {
protected:
    void SetUp() override {
        RowsFixture::SetUp();
        Insert("'B100|1'", "'a secret value'", "'1700000000000'");
        std::filesystem::create_directories(Logs());
        std::ofstream log(Logs() + "/Report.log");
        for (int line = 0; line < 2500; ++line)
            log << "2026-11-20 10:15:30.123 INFO  [1:2] [App/ReportServer:42 Recv] {\"eventID\":\"B100|"
                << line << "\",\"value\":\"a secret value\"}\n";
    }

    std::string Logs() const { return Data() + "/hublink/log/metrik"; }
    std::string File() const { return Data() + "/bundle.tar.gz"; }
    Outcome Bundle(const std::string& arguments = {}) const {
        return Reportctl("bundle '" + File() + "' " + arguments, "HOME='" + Data() + "'");
    }
    std::string Part(const std::string& name) const {
        return Run("tar -xzOf '" + File() + "' reportctl-bundle/" + name).output;
    }
    std::string All() const { return Run("tar -xzOf '" + File() + "'").output; }
};

TEST_F(BundleCommand, HoldsWhatSupportNeedsAndNoValue) {
    const auto outcome = Bundle();
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_TRUE(outcome.Says("log.txt")) << outcome.output;
    EXPECT_EQ(ModeOf(File()), 0600u);
    EXPECT_NE(Part("store-counts.txt").find("B100|1\n"), std::string::npos);
    EXPECT_NE(Part("store-schema.sql").find("CREATE TABLE OperLog"), std::string::npos);
    EXPECT_NE(Part("versions.txt").find("reportctl "), std::string::npos);
    EXPECT_NE(Part("outbox-counts.txt").find("could not be read: there is no outbox: ~/hublink"),
              std::string::npos);
    const auto log = Part("log.txt");
    EXPECT_EQ(std::count(log.begin(), log.end(), '\n'), 2000);
    EXPECT_NE(log.find("B100|2499"), std::string::npos);
    EXPECT_EQ(All().find("secret"), std::string::npos);
    EXPECT_EQ(All().find(Data()), std::string::npos);
}

TEST_F(BundleCommand, HoldsValuesWhenItIsAskedTo) {
    EXPECT_TRUE(Bundle("--with-values").Says("with the values of reports"));
    EXPECT_NE(Part("log.txt").find("a secret value"), std::string::npos);
}

TEST_F(BundleCommand, LeavesNothingBehindWhereItCannotWrite) {
    const auto outcome = Reportctl("bundle '" + Data() + "/no/such/file.tar.gz'");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_TRUE(outcome.Says("cannot write " + Data() + "/no/such/file.tar.gz")) << outcome.output;
}

} // namespace
