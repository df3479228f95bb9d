#include "SystemTool/BSException.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

using SystemTool::BSErrorText;
using SystemTool::BSException;
using ::testing::MatchesRegex;

constexpr auto TIME = R"(\[[0-9]{4}-[0-9]{2}-[0-9]{2} [0-9]{2}:[0-9]{2}:[0-9]{2}\])";

TEST(BSException, ShowsItsTextsInOneLine) {
    const auto error = BSException("no log") << BSErrorText("disk full");
    EXPECT_THAT(error.ErrorMsg(),
                MatchesRegex(TIME + std::string(R"(\[STL ERR\] no log \[BOOST ERR\] disk full)") + "\n"));
}

TEST(BSException, ShowsAnEmptyAttachedTextWhenThereIsNone) {
    EXPECT_THAT(BSException("no log").ErrorMsg(),
                MatchesRegex(TIME + std::string(R"(\[STL ERR\] no log \[BOOST ERR\] )") + "\n"));
}

TEST(BSException, IsAStandardException) {
    try {
        throw BSException("main text") << BSErrorText("attached");
    } catch (const std::exception& error) {
        EXPECT_STREQ(error.what(), "main text");
    }
}
