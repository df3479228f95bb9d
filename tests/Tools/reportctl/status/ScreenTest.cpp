#include <cstdlib>
#include <ctime>
#include <sstream>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Tools/reportctl/status/Status.h"

namespace {

using namespace reportctl::status;
using ::testing::HasSubstr;
using ::testing::Not;

class StatusScreen : public testing::Test {
protected:
    StatusScreen() {
        ::setenv("TZ", "CET-1", 1);
        ::tzset();
        m_status.atMs = 1'763'733'966'789;
        m_status.service.isRunning = true;
        m_status.service.isListening = true;
        m_status.service.process = 4711;
        m_status.service.startedAtMs = 1'763'733'906'789;
        m_status.service.version = "0.2.0";
        m_status.store.isPresent = true;
        m_status.store.path = "/home/u1/.local/share/hublink/database/Report.db";
        m_status.store.newestCreateTime = "1763733966789";
        m_status.log.errors = 1;
        m_status.log.warnings = 2;
        m_status.log.lastTexts.push_back({{m_status.atMs, "ERROR", "Frame/DBHelper:34 ExecSql",
                                           "near \"s\": syntax error-insert into OperLog (eventID,value)"},
                                          1});
    }
    ~StatusScreen() override {
        ::unsetenv("TZ");
        ::tzset();
    }

    std::string Shown(const View& view) const {
        return ScreenOf(
            m_status,
            {Verdict::Degraded,
             {"In the last ten minutes, a report was refused by the store. The log has each of them "
              "with the reason: docs/Reliability.md tells what it means."}},
            view);
    }

    Status m_status;
};

TEST_F(StatusScreen, FitsEightyColumns) {
    const auto text = Shown({.isColoured = false, .columns = 80});
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);)
        EXPECT_LE(line.size(), 80u) << line;
    EXPECT_THAT(text,
                HasSubstr("           - In the last ten minutes, a report was refused by the store. The log\n"
                          "             has each of them with the reason: docs/Reliability.md tells what it\n"
                          "             means.\n"));
}

TEST_F(StatusScreen, HasALineForEachFactWithoutATerminal) {
    EXPECT_THAT(Shown({}),
                HasSubstr("a report was refused by the store. The log has each of them with the reason: "
                          "docs/Reliability.md tells what it means.\n"));
}

TEST_F(StatusScreen, HasLocalTimesAndCountsInWords) {
    const auto text = Shown({});
    EXPECT_THAT(text,
                HasSubstr("running as process 4711 for 60 s (since 2025-11-21 15:05:06), version 0.2.0"));
    EXPECT_THAT(text, HasSubstr("in the last ten minutes 1 error, 2 warnings\n"));
    EXPECT_THAT(text, HasSubstr("           15:06:06 ERROR [Frame/DBHelper:34 ExecSql] near \"s\""));
}

TEST_F(StatusScreen, HasColoursOnlyWhereTheyAreWanted) {
    EXPECT_THAT(Shown({.isColoured = true}), HasSubstr("\x1b[1;33mdegraded\x1b[0m"));
    EXPECT_THAT(Shown({}), Not(HasSubstr("\x1b")));
}

} // namespace
