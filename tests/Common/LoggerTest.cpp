#include "Common/Common.h"

#include <algorithm>
#include <chrono>
#include <utility>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "App/ReportServer.h"
#include "Metrik/MetrikMgr.h"
#include "tests/fakes/FakeLogger.h"

using namespace SyncServiceReport;
using ::testing::ElementsAre;
using ::testing::StartsWith;

namespace {

constexpr LogSite SITE{LogLevel::Info, "Function", 7};

/// Logs `format` at SITE, which must give one record, and returns that.
template <typename... Arguments>
LogRecord Logged(const std::string& format, const Arguments&... arguments) {
    FakeLogger().Clear();
    WriteLog(SITE, format, arguments...);
    const auto records = FakeLogger().Records();
    EXPECT_EQ(records.size(), 1U) << format;
    return records.empty() ? LogRecord{} : records.front();
}

LogRecord Plain(const std::string& message) {
    return {2, "Common/LoggerTest", "Function", 7, message};
}

LogRecord BoostLogError(const std::string& why) {
    return {4, "Common/LoggerTest", "Function", 7, "[BoostLogError]" + why};
}

bool IsBoostLogError(const LogRecord& record) {
    return record == BoostLogError(record.message.substr(std::min<std::size_t>(record.message.size(), 15)));
}

/// The text, or the reason why it could not be built.
template <typename MakeText>
std::string TextOrReason(MakeText makeText) {
    try {
        return makeText();
    } catch (const std::exception& error) {
        return std::string("cannot be built: ") + error.what();
    }
}

template <typename Action>
std::chrono::steady_clock::duration BestOfTwenty(Action action) {
    auto best = std::chrono::steady_clock::duration::max();
    for (int i = 0; i < 20; ++i) {
        const auto begin = std::chrono::steady_clock::now();
        action();
        best = std::min(best, std::chrono::steady_clock::now() - begin);
    }
    return best;
}

} // namespace

TEST(WriteLog, WritesLevelFileFunctionLineAndTextWithAnEmptyTagAndZero) {
    EXPECT_EQ(Logged("Start"), Plain("Start"));
}

TEST(WriteLog, PutsArgumentsIntoTheText) {
    EXPECT_EQ(Logged("Unknown exception :%d-%s", 5, "why"), Plain("Unknown exception :5-why"));
}

TEST(WriteLog, LeavesPercentSignsOfAnArgumentAlone) {
    EXPECT_EQ(Logged("Std exception :%s ", "100 %s %d %"), Plain("Std exception :100 %s %d % "));
}

TEST(WriteLog, UsesTheSitesOwnLineWhereNoneIsFixed) {
    const int lineBefore = __LINE__;
    WriteLog({LogLevel::Error, "Function"}, "text");
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(LogRecord{4, "Common/LoggerTest", "Function", lineBefore + 1, "text"}));
}

TEST(WriteLog, FormatsDirectivesThatNeedNoArgument) {
    EXPECT_EQ(Logged("100%% of %%s"), Plain("100% of %s"));
    EXPECT_EQ(Logged("a%|9t|b"), Plain("a        b"));
    EXPECT_EQ(Logged("a%9tb"), Plain("a        b"));
    EXPECT_EQ(Logged("a%|5T-|b"), Plain("a----b"));
}

TEST(WriteLog, ReportsATextThatCannotBeBuilt) {
    const std::string tooFewArguments =
        "boost::too_few_args: format-string referred to more arguments than were passed";
    EXPECT_EQ(Logged("%s"), BoostLogError(tooFewArguments));
    EXPECT_EQ(Logged("50 %d"), BoostLogError(tooFewArguments));
    EXPECT_EQ(Logged("%1%"), BoostLogError(tooFewArguments));
    EXPECT_EQ(Logged("100 %"), BoostLogError("boost::bad_format_string: format-string is ill-formed"));
    EXPECT_EQ(
        Logged("no directive", 1),
        BoostLogError("boost::too_many_args: format-string referred to fewer arguments than were passed"));
}

TEST(WriteLog, LetsATextFromOutsideGrowByFourKibibytesAndNoMore) {
    EXPECT_EQ(Logged("a%|4105t|"), Plain("a" + std::string(4104, ' '))) << "from 9 bytes";
    EXPECT_EQ(Logged("a%|4106t|"),
              BoostLogError("the text would grow from 9 to 4106 bytes, too many for a log record"));
    EXPECT_EQ(Logged("%|65000t|"),
              BoostLogError("the text would grow from 9 to 65000 bytes, too many for a log record"));
    const std::string long10k(10'000, 'x');
    EXPECT_EQ(Logged(long10k + "%|14000t|"), Plain(long10k + std::string(4000, ' ')));
}

TEST(WriteLog, CountsATextOfMoreThanOneMebibyteAsOneThatCannotBeBuilt) {
    const std::string mebibyte(1048576, 'x');
    EXPECT_EQ(Logged("%s", mebibyte), Plain(mebibyte));
    EXPECT_EQ(Logged("%s", mebibyte + "x"),
              BoostLogError("the text would have 1048577 bytes, more than the 1048576 of a log record"));
    EXPECT_EQ(Logged(mebibyte), Plain(mebibyte));
    EXPECT_TRUE(IsBoostLogError(Logged(mebibyte + "x")));
    EXPECT_TRUE(IsBoostLogError(Logged(mebibyte + "x%%")));
}

TEST(WriteLog, BuildsNoGigabytesFromATabulationInAnySpelling) {
    const auto begin = std::chrono::steady_clock::now();
    for (const std::string format :
         {"a%|2000000000t|", "a%2000000000t", "a%1$2000000000tx", "a%-2000000000t", "a%'2000000000t",
          "%|2000000000T*|", "%|2000000000t|%|1999999999t|", "%|9223372036854775807t|x",
          "%|9223372036854775807t|a%|0t|", "%|99999999999999999999t|", "%2000000000s", "%.2000000000s",
          "%2000000000%"})
        EXPECT_TRUE(IsBoostLogError(Logged(format)))
            << format << " gave " << Logged(format).message.size() << " bytes";
    EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(5)) << "nothing was built";
}

TEST(WriteLog, LeavesLongNumbersThatBelongToNoDirectiveAlone) {
    for (const std::string text :
         {"1234567890123", "%% 1234567890123", "a%|3t|1234567890123", "%%%%9999999999"})
        EXPECT_EQ(Logged(text).level, 2) << text;
    EXPECT_EQ(Logged("a%|0000000000005t|b"), Plain("a0000b")) << "leading zeros make no large number";
}

TEST(WriteLog, FormatsATabulationWhoseFillIsAPercentSign) {
    EXPECT_EQ(Logged("%1T%%|9t|"), Plain("%        "));
    std::string many;
    for (int i = 0; i < 1000; ++i)
        many += "%1T%%|9t|";
    EXPECT_EQ(Logged(many).level, 2) << "as many directives as a datagram has room for";
}

TEST(WriteLog, ChecksTheNumbersOfEveryDirective) {
    for (const std::string format : {"%5%%473123456789019", "%T%%81000000000-", "%|1$1234567890|",
                                     "%1$.1234567890s", "%-1234567890d", "%.1234567890s", "%1234567890%"})
        EXPECT_EQ(Logged(format), BoostLogError("a directive of the text has a number of more than 9 digits"))
            << format;
}

TEST(WriteLog, FormatsADirectiveThatBoostIgnores) {
    EXPECT_EQ(Logged("50%no"), Plain("50o"));
    EXPECT_TRUE(IsBoostLogError(Logged("%0n%-hxo2"))) << "and no assertion ends the program";
}

TEST(WriteLog, GoesOnWithWhatAnIgnoredDirectiveSet) {
    EXPECT_EQ(Logged("a%5n%tb"), Plain("a    b"));
    EXPECT_EQ(Logged("a%05n%|7t|b"), Plain("a000000b"));
}

TEST(WriteLog, ReportsDirectivesThatDoNotMix) {
    EXPECT_EQ(Logged("%1% %s"), BoostLogError("boost::bad_format_string: format-string is ill-formed"));
}

TEST(WriteLog, RefusesAPercentSignAtTheEndAlsoAsAFill) {
    EXPECT_EQ(Logged("%9T%"), BoostLogError("boost::bad_format_string: format-string is ill-formed"));
}

TEST(WriteLog, BoundsATextOfManyTabulations) {
    const auto withColumns = [](int step) {
        std::string format;
        for (int column = 1; column <= 200; ++column)
            format += "%|" + std::to_string(column * step) + "t|x";
        return format;
    };
    EXPECT_EQ(Logged(withColumns(20)).message.size(), 200U * 20 + 1);
    EXPECT_TRUE(IsBoostLogError(Logged(withColumns(100))));
}

TEST(WriteLog, GivesWhatBoostFormatGives) {
    for (const std::string text :
         {"",      "plain", "%%",   "100%% of %%s", "a%|9t|b",  "a%9tb", "a%|5T-|b", "a%05tb",  "a%-05tb",
          "50%no", "%",     "%|",   "%|1",          "%1",       "%1%",   "%1% %2%",  "%2$s",    "%s%1%",
          "%|1%",  "%|s",   "%|s|", "%|s",          "%y",       "%I64d", "%I3d",     "%Id",     "%hhd",
          "%.*f",  "%*d",   "%.3s", "%+5n%t|",      "%c%n%t%%", "%5T",   "%5T%",     "%|5T%|x", "%5T%x"})
        EXPECT_EQ(TextOrReason([&] { return BuildLogText(text); }),
                  TextOrReason([&] { return boost::format(text).str(); }))
            << text;
}

TEST(WriteLog, TakesLittleTimeForADatagramOfPercentSigns) {
    for (const std::string directive : {"%%", "%s", "%t", "%1%", "%n"}) {
        std::string datagram;
        while (datagram.size() + directive.size() <= 10240)
            datagram += directive;
        const auto format = [&] { TextOrReason([&] { return BuildLogText(datagram); }); };
        const auto bare = [&] { TextOrReason([&] { return boost::format(datagram).str(); }); };
        EXPECT_LT(BestOfTwenty(format), 2 * BestOfTwenty(bare)) << directive;
    }
}

TEST(WriteLog, ReportsAWriteThatThrows) {
    bool hasThrown = false;
    FakeLogger().onWrite = [&hasThrown](const LogRecord&) {
        if (!std::exchange(hasThrown, true))
            throw std::runtime_error("disk full");
    };
    EXPECT_EQ(Logged("text"), BoostLogError("disk full"));
    FakeLogger().onWrite = nullptr;
}

TEST(WriteLog, IsSilentWhenTheLoggerKeepsThrowing) {
    for (const Throws what : {Throws::Poco, Throws::Std, Throws::Other}) {
        FakeLogger().throws = what;
        WriteLog(SITE, "text");
    }
    FakeLogger().throws = Throws::Nothing;
    EXPECT_THAT(FakeLogger().Records(), ElementsAre());
}

TEST(LogCaughtException, NamesEachKindOfExceptionInItsOwnWords) {
    const auto logged = [](auto exception) {
        FakeLogger().Clear();
        try {
            throw exception;
        } catch (...) {
            EXPECT_FALSE(LogCaughtException({LogLevel::Warning, "Consume", 76}));
        }
        return FakeLogger().Records();
    };
    const auto warning = [](const std::string& text) {
        return LogRecord{3, "Common/LoggerTest", "Consume", 76, text};
    };
    EXPECT_THAT(logged(Poco::IOException("disk 100%s")),
                ElementsAre(warning("Poco exception :I/O error: disk 100%s ")));
    EXPECT_THAT(logged(std::runtime_error("bad %d")), ElementsAre(warning("Std exception :bad %d ")));
    errno = ENOENT;
    EXPECT_THAT(logged(42), ElementsAre(warning("Unknown exception :2-No such file or directory")));
}

TEST(LogCaughtException, ReportsAnExceptionWhoseTextIsTooLong) {
    try {
        throw std::runtime_error(std::string(1048576, 'x'));
    } catch (...) {
        EXPECT_FALSE(LogCaughtException({LogLevel::Warning, "Consume", 76}));
    }
    EXPECT_THAT(FakeLogger().Records(),
                ElementsAre(LogRecord{4, "Common/LoggerTest", "Consume", 76,
                                      "[BoostLogError]the text would have 1048592 bytes, more than the "
                                      "1048576 of a log record"}));
}

TEST(PerFileLogger, IsAnInstanceOfItsOwnInEachSourceFile) {
    EXPECT_NE(pSysLog, nullptr);
    EXPECT_EQ(pSysLog, g_LoggerLoader.GetModule());
    EXPECT_EQ(g_LoggerLoader.GetModuleName(), "libBoostLogger.dylib");
    EXPECT_GT(FakeLogger().created, 5) << "the core's source files have theirs too";
}

TEST(PerFileLogger, OfOneFileIsNotThatOfAnother) {
    WriteLog(SITE, "text");
    ReportServer server;
    server.Recv("text");
    MetrikMgr manager(&server);
    manager.Update("no JSON");
    const auto instances = FakeLogger().InstanceOfFile();
    EXPECT_EQ(instances.at("Common/LoggerTest"), pSysLog);
    EXPECT_NE(instances.at("App/ReportServer"), pSysLog);
    EXPECT_NE(instances.at("Metrik/MetrikMgr"), pSysLog);
    EXPECT_NE(instances.at("App/ReportServer"), instances.at("Metrik/MetrikMgr"));
}

TEST(Constants, HaveTheirValues) {
    EXPECT_EQ(ORVEK_EMPTY_STRING, "");
    EXPECT_EQ(ORVEK_SPACE_STRING, " ");
    EXPECT_EQ(DATE_TIME_FORMAT_MS, "%Y-%m-%d %H:%M:%S:%i");
    EXPECT_EQ(WIN_REG_PATH, R"(HKEY_LOCAL_MACHINE\SOFTWARE\HubLink)");
    EXPECT_EQ(MAC_REG_PATH, "/Library/Preferences/hublink");
    EXPECT_EQ(MAC_REG_INI, "/Library/Preferences/hublink/local_machine.ini");
    EXPECT_EQ(APP_LOG_DIR_PATH, SystemTool::CommonTool::GetUserDataDir() + "/hublink/log/metrik");
    EXPECT_EQ(ORVEK_EXCUTABLE_PATH, SystemTool::IO::Directory::GetExcutableDirectory());
    EXPECT_EQ(UDP_SERVER_IP, "127.0.0.1");
    EXPECT_EQ(DEFAULT_MODULE_ID, "A759");
    EXPECT_EQ(DEFAULT_MODULE_VERSION, "1");
    EXPECT_EQ(DEFAULT_MODULE_NAME, "default");
    EXPECT_EQ(ORVEK_REPORT_MODULEINIT, "init");
    EXPECT_EQ(ORVEK_REPORT_UPDATEOPENID, "updateOpenID");
}

TEST(Records, HaveTheirDefaults) {
    const ST_OptLog log;
    EXPECT_EQ(log.nReserved, 0);
    EXPECT_EQ(log.pType, 1);
    EXPECT_FALSE(log.isDayReport);
    EXPECT_EQ(log.eventID + log.value + log.createTime, "");
    const ST_BaseInfo info;
    EXPECT_EQ(info.userDataDir, "");
    EXPECT_EQ(info.openID, "visitor");
    EXPECT_EQ(info.suiteVersion, "3.0.0.0");
    EXPECT_EQ(info.osVersion, "");
}
