#include <algorithm>
#include <filesystem>
#include <fstream>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <sys/resource.h>

#include "tests/Tools/reportctl/support/RowsFixture.h"

namespace {

using ::testing::HasSubstr;

/// A log that is longer than what the commands keep of it, with the rows of its reports.
class LongLog : public RowsFixture {
protected:
    static constexpr int REPORTS = 80'000; // 17 MiB
    static constexpr int REFUSED = 33'333;

    void SetUp() override {
        RowsFixture::SetUp();
        std::ofstream log(Data() + "/hublink/log/metrik/Report.log");
        const auto stamp = "2026-11-20 10:15:30.123 ";
        for (int i = 0; i < REPORTS; ++i)
            log << stamp << "INFO  [1:2] [App/ReportServer:42 Recv] "
                << fmt::format(R"({{"eventID":"B1|1","value":"{} {:080}","createTime":1700000000}})", i, 0)
                << "\n";
        log << stamp << "ERROR [1:3] [App/ReportServer:157 JsonToStruct] a line without a datagram\n";
        Sql(fmt::format(
            "with recursive n(i) as (select 0 union all select i + 1 from n where i + 1 < {}) insert into "
            "OperLog (eventID, value, createTime) select 'B1|1', i || printf(' %080d', 0), 1700000000000 "
            "from n where i <> {}",
            REPORTS, REFUSED));
    }

    /// Of the largest program that has run, in MiB.
    static long PeakMemory() {
        struct rusage usage {};
        ::getrusage(RUSAGE_CHILDREN, &usage);
        return usage.ru_maxrss / 1024;
    }
};

TEST(Tail, TakesNoNegativeNumberOfLines) {
    EXPECT_EQ(std::system(REPORTCTL " tail --no-follow --lines -1 2>/dev/null >&2") >> 8, 105);
}

TEST_F(LongLog, IsShownAndSearchedWithoutBeingKept) {
    const auto shown = OutputOf("tail --no-follow --since 2020-01-01");
    EXPECT_EQ(std::count(shown.begin(), shown.end(), '\n'), REPORTS + 1);
    EXPECT_THAT(shown, HasSubstr(fmt::format("B1|1           {} 0000", REFUSED)));
    std::size_t stored = 0;
    for (auto at = shown.find("-> stored\n"); at != std::string::npos; at = shown.find("-> stored\n", at + 1))
        ++stored;
    EXPECT_EQ(stored, static_cast<std::size_t>(REPORTS - 1));
    EXPECT_THAT(OutputOf(fmt::format("find '{} 0000'", REFUSED)), HasSubstr("-> unknown\nStore"));
    const auto last = OutputOf("tail --no-follow");
    EXPECT_EQ(std::count(last.begin(), last.end(), '\n'), 10);
    EXPECT_THAT(last, HasSubstr(fmt::format("B1|1           {} 0000", REPORTS - 1)));
    EXPECT_THAT(last, HasSubstr("a line without a datagram\n"));
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)
    EXPECT_LT(PeakMemory(), 80) << "MiB; all of the log at once would be 170";
#endif
}

} // namespace
