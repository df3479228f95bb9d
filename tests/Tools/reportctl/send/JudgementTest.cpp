#include "tests/Tools/reportctl/support/SendFixture.h"

namespace {

const std::string TIME = R"(,"createTime":1700000000})";
const std::string NOT_SENT = "dry run: would send 0 messages (0 bytes); left out 1 line\n";

class SendJudgement : public SendFixture {
protected:
    /// What the program says about a text, without its other output; empty when the text is good.
    std::string Said(const std::string& text) const {
        const auto outcome = Send(FileOf(text) + "--dry-run");
        const bool isSent = outcome.exitCode == 0;
        std::string said = outcome.output;
        Remove(said, isSent ? text + "\n" : "");
        Remove(said, isSent ? "dry run: would send 1 message (" + std::to_string(text.size()) + " bytes)\n"
                            : NOT_SENT);
        return said;
    }

    void ExpectGood(const std::string& text) const { EXPECT_EQ(Said(text), "") << text; }

    void ExpectError(const std::string& text, const std::string& reason) const {
        EXPECT_EQ(Said(text), "error: line 1: " + reason + "\n") << text;
    }

    void ExpectWarning(const std::string& text, const std::string& reason) const {
        EXPECT_EQ(Said(text), "warning: line 1: " + reason + "\n") << text;
    }

    static std::string Report(const std::string& eventID, const std::string& value = "\"\"") {
        return "{\"eventID\":\"" + eventID + "\",\"value\":" + value + TIME;
    }

    static std::string Control(const std::string& msgType, const std::string& exdata) {
        return "{\"msgType\":\"" + msgType + "\",\"exdata\":{" + exdata + "}}";
    }

private:
    static void Remove(std::string& from, const std::string& text) {
        const auto place = from.rfind(text);
        ASSERT_NE(place, std::string::npos) << from;
        from.erase(place, text.size());
    }
};

TEST_F(SendJudgement, LetsPassWhatTheServiceTakes) {
    for (const auto& text :
         {Report("B100|10001"), Report("B"), Report("a1", "5"), Report("|x", "[1]"), Report("x|y|z", "null"),
          Report("B", R"("it''s, '''' and ''")"), Report("B", R"({"a":"it''s","b":"\u0000"})"),
          Report("A1|2"), Report("A1|2", "null"), Report("A1|2", "{}"), Report("A1|2", R"("{\"a\":1}")"),
          Report("A1|2", R"("null")"), Report("A1|it's", R"({"a":"it's"})"), Report("A|"),
          Control("init", R"("moduleID":"A1")"), Control("init", R"("moduleID":"A1","moduleName":"it's")"),
          Control("updateOpenID", R"("openID":5)"),
          std::string(R"({"eventID":"B","createTime":"1700000000123"})"),
          Report("B", "\"" + std::string(10'240 - Report("B").size(), 'x') + "\"")})
        ExpectGood(text);
}

TEST_F(SendJudgement, RefusesWhatTheServiceWouldCut) {
    ExpectError(Report("B", "\"" + std::string(10'241 - Report("B").size(), 'x') + "\""),
                "it has 10241 bytes, and the service cuts a text off after 10240");
    ExpectError(Report("B").replace(3, 1, 1, '\0'),
                "it holds a zero byte, and the service cuts a text off there: byte 3");
}

TEST_F(SendJudgement, RefusesWhatIsNoJsonInTheParsersWords) {
    ExpectError(Report("B") + "}", "it is not JSON: The document root must not be followed by other values. "
                                   "At byte 50.");
    ExpectError("eventID", "it is not JSON: Invalid value. At byte 0.");
    ExpectError(Report("\xff"), "it is not JSON: Invalid encoding in string. At byte 12.");
    for (const auto* text : {"\"eventID\"", "[]", "5", "null"})
        ExpectError(text, "it is JSON but no object: the service would find nothing in it");
}

TEST_F(SendJudgement, RefusesAReportOfNoEvent) {
    const std::string reason = "it has no event id (no \"eventID\" at the top level, or an empty one): the "
                               "service would store a report that belongs to no event";
    ExpectError(R"({"value":"eventID")" + TIME, reason);
    ExpectError(R"({"exdata":{"eventID":"B"})" + TIME, reason);
    ExpectError(Report(""), reason);
    ExpectError(R"({"eventID":null)" + TIME, reason);
}

TEST_F(SendJudgement, RefusesAControlMessageOfUnknownKind) {
    const auto reason = [](const std::string& msgType) {
        return "it is no report (there is no \"eventID\" in it) and no control message that the service "
               "knows "
               "(its msgType is " +
               msgType +
               ", and must be \"init\" or \"updateOpenID\" to the letter): the service would ignore it";
    };
    ExpectError("{}", reason("null"));
    ExpectError(R"({"event\u0049D":"B"})", reason("null"));
    ExpectError(Control("Init", R"("moduleID":"A1")"), reason("\"Init\""));
    ExpectError(R"({"msgType":["init"]})", reason("[\"init\"]"));
}

TEST_F(SendJudgement, RefusesAControlMessageThatWouldBeTakenForAReport) {
    const std::string reason = "it is a control message with the text \"eventID\" somewhere in it, and the "
                               "service takes every such text for a report. Where the text must be, spell it "
                               "event\\u0049D";
    ExpectError(Control("init", R"("moduleID":"A1","moduleName":"eventID")"), reason);
    ExpectError(Control("updateOpenID", R"("openID":"u1","eventID":"B")"), reason);
    ExpectGood(Control("init", R"("moduleID":"A1","moduleName":"event\u0049D")"));
}

TEST_F(SendJudgement, RefusesAControlMessageWithoutItsSubject) {
    ExpectError(Control("updateOpenID", R"("hublinkVersion":"5")"),
                "it has no openID in its exdata: the service would do nothing");
    ExpectError(R"({"msgType":"updateOpenID","openID":"u1"})",
                "it has no openID in its exdata: the service would do nothing");
    ExpectError(Control("init", R"("openID":"u1")"),
                "it has no moduleID in its exdata: no event could belong to the module");
}

TEST_F(SendJudgement, RefusesAnAnalyticsEventThatNobodyTakes) {
    ExpectError(Report("A100"),
                "its event id begins with \"A\", so it goes to analytics, which drops it: there is no bar in "
                "it to tell the module from the event. Write it like A100|10001");
    const std::string reason = "its value must be empty or a JSON object for analytics, or the event is "
                               "dropped; this one is ";
    ExpectError(Report("A1|2", "\"opened\""), reason + "not JSON: Invalid value. At byte 0.");
    for (const auto* value : {"5", "[1]", "true", R"("5")", R"("\"x\"")"})
        ExpectError(Report("A1|2", value), reason + "JSON of another kind");
}

TEST_F(SendJudgement, RefusesAQuoteThatTheDatabaseWouldStumbleOver) {
    const auto reason = [](const std::string& name) {
        return "its " + name +
               " holds a single quote. The service puts the text into its SQL as it is, and the database "
               "would "
               "reject the report. Write the quote twice: ''";
    };
    ExpectError(Report("B'"), reason("event id"));
    ExpectError(Report("B", R"("it's")"), reason("value"));
    ExpectError(Report("B", R"("it'''s")"), reason("value"));
    ExpectError(Report("B", R"("''it\u0027s")"), reason("value"));
    ExpectError(Report("B", R"({"it's":1})"), reason("value"));
    ExpectError(
        Report("B", R"("x\u0000y")"),
        "its value holds a zero character (\\u0000). The service puts the text into its SQL as it is, "
        "and the database would reject the report");
}

TEST_F(SendJudgement, RefusesAUserWhoWouldSpoilEveryReport) {
    const auto reason = [](const std::string& name) {
        return "its " + name +
               " holds a single quote. The service puts the text into its SQL as it is, and the database "
               "would "
               "reject every report while it is set. Written twice it is stored as one quote, and goes to "
               "analytics as two";
    };
    ExpectError(Control("updateOpenID", R"("openID":"it's me")"), reason("openID"));
    ExpectError(Control("init", R"("moduleID":"A1","openID":"u1","hublinkVersion":"5'")"),
                reason("hublinkVersion"));
}

TEST_F(SendJudgement, WarnsOfWhatWillSurprise) {
    const std::string module = "no event will reach this module: only event ids that begin with \"A\" go to "
                               "analytics, and their module is what stands before the bar";
    ExpectWarning(Control("init", R"("moduleID":"B1")"), module);
    ExpectWarning(Control("init", R"("moduleID":"A1|2")"), module);
    ExpectWarning(Control("init", R"("moduleID":"A1","hublinkVersion":"5")"),
                  "its hublinkVersion has no effect: the service takes a version over only together with an "
                  "openID");
    ExpectWarning(Report("B", "\"100 %\""),
                  "it holds a percent sign: the log may show a line with \"[BoostLogError]\" in place of it. "
                  "It is processed all the same");
    ExpectWarning(R"({"eventID":"B"})", "it has no createTime; the service keeps an empty one");
    for (const auto* time : {"-170000000", "\"yesterday!\""})
        ExpectWarning(R"({"eventID":"B","createTime":)" + std::string(time) + "}",
                      "its createTime has ten characters that are not ten digits; the service takes it for "
                      "seconds and appends 000");
    ExpectWarning(Control("updateOpenID", R"("openID":"it''s me")"),
                  "its openID holds a single quote written twice: it is stored as one quote, and goes to "
                  "analytics as two");
    for (const auto* time : {"5", "17000000001", "1700000000.5", "\"yesterday\""})
        ExpectWarning(
            R"({"eventID":"B","createTime":)" + std::string(time) + "}",
            "its createTime has neither ten digits (seconds since 1970) nor thirteen (milliseconds); "
            "the service keeps it as it is");
}

TEST_F(SendJudgement, NamesEverythingThatIsWrong) {
    EXPECT_EQ(
        Said(R"({"eventID":"B'","value":"'","createTime":"it's now"})"),
        "warning: line 1: its createTime has neither ten digits (seconds since 1970) nor thirteen "
        "(milliseconds); the service keeps it as it is\n"
        "error: line 1: its event id holds a single quote. The service puts the text into its SQL as it "
        "is, and the database would reject the report. Write the quote twice: ''\n"
        "error: line 1: its value holds a single quote. The service puts the text into its SQL as it is, "
        "and the database would reject the report. Write the quote twice: ''\n"
        "error: line 1: its createTime holds a single quote. The service puts the text into its SQL as "
        "it is, and the database would reject the report. Write the quote twice: ''\n");
}

TEST_F(SendJudgement, WarnsOfASmallAThatLeadsToTheStore) {
    ExpectWarning(
        R"({"eventID":"a100|1")" + TIME,
        "its event id begins with a small \"a\", so it goes to the store; those for analytics begin "
        "with \"A\"");
    ExpectGood(R"({"eventID":"a100")" + TIME);
}

TEST_F(SendJudgement, WarnsOfANameThatIsAlmostRight) {
    const std::string notSeen = ", which the service does not see: the name is ";
    ExpectWarning(R"({"eventID":"B1","Value":1)" + TIME,
                  "it has a member Value" + notSeen + "\"value\", to the letter");
    ExpectWarning(R"({"eventID":"B1","is_day_report":1)" + TIME,
                  "it has a member is_day_report" + notSeen + "\"isDayReport\", to the letter");
    EXPECT_NE(Said(R"({"eventID":"B1","createtime":1700000000})")
                  .find("it has a member createtime" + notSeen + "\"createTime\", to the letter"),
              std::string::npos);
    EXPECT_NE(Said(R"({"eventid":"B1")" + TIME).find("it has a member eventid" + notSeen + "\"eventID\""),
              std::string::npos);
    ExpectGood(R"({"eventID":"B1","Createtime":1)" + TIME);
}

TEST_F(SendJudgement, WarnsOfNamesInExdataThatAreAlmostRight) {
    const std::string notSeen = " in its exdata, which the service does not see: the name is ";
    ExpectWarning(Control("init", R"("moduleID":"A1","openid":"u")"),
                  "it has a member openid" + notSeen + "\"openID\", to the letter");
    ExpectWarning(Control("init", R"("moduleID":"A1","DBPath":"/x")"),
                  "it has a member DBPath" + notSeen + "\"dbPath\", to the letter");
    ExpectWarning(Control("updateOpenID", R"("openID":"u","hublinkversion":"1")"),
                  "it has a member hublinkversion" + notSeen + "\"hublinkVersion\", to the letter");
    EXPECT_NE(Said(Control("init", R"("moduleId":"A1")"))
                  .find("it has a member moduleId" + notSeen + "\"moduleID\", to the letter"),
              std::string::npos);
    ExpectGood(Control("init", R"("moduleID":"A1","ModuleID":"A2","page":1)"));
    ExpectGood(R"({"eventID":"B1","exdata":{"openid":"u"})" + TIME);
}

} // namespace
