#include "Modules/MetrikSdk/upload/StartSpread.h"

#include <gtest/gtest.h>

using namespace MetrikSdk;
using namespace std::chrono_literals;

namespace {

class StartSpread : public testing::Test {
protected:
    std::optional<std::chrono::milliseconds> Read(const char* value) {
        const auto lookUp = [value](const char* name) {
            return std::string(name) == "METRIK_START_SPREAD" ? value : nullptr;
        };
        return upload::ReadStartSpread(lookUp, m_complaints);
    }

    std::vector<std::string> m_complaints;
};

TEST_F(StartSpread, IsANumberOfMillisecondsUpToAnHour) {
    EXPECT_EQ(Read("0"), 0ms);
    EXPECT_EQ(Read("90000"), 90s);
    EXPECT_EQ(Read("3600001"), 1h);
    EXPECT_TRUE(m_complaints.empty());
}

TEST_F(StartSpread, IsUnsetWithoutAValue) {
    EXPECT_EQ(Read(nullptr), std::nullopt);
    EXPECT_EQ(Read(""), std::nullopt);
    EXPECT_TRUE(m_complaints.empty());
}

TEST_F(StartSpread, IsUnsetAndToldWhenItMakesNoSense) {
    for (const auto* senseless : {"-1", "1s", " 1", "99999999999999999999"})
        EXPECT_EQ(Read(senseless), std::nullopt) << senseless;
    EXPECT_EQ(m_complaints.size(), 4U);
    EXPECT_EQ(m_complaints.front(), "METRIK_START_SPREAD is no number of milliseconds and counts as unset");
}

} // namespace
