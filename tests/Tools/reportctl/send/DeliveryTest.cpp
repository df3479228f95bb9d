#include <chrono>

#include "tests/Tools/reportctl/support/SendFixture.h"
#include "tests/support/WaitUntil.h"

namespace {

class SendLines : public SendFixture {
protected:
    /// A good report: event B<n>.
    static std::string Line(int number) {
        return "{\"eventID\":\"B" + std::to_string(number) + "\",\"createTime\":1700000000}";
    }

    /// Starts `reportctl send -` with a pipe to which the test writes line by line. The program's output goes
    /// to a file.
    FILE* StartOnAPipe() const {
        const auto command = "'" REPORTCTL "' send - >'" + Data() + "/said' 2>&1";
        return ::popen(command.c_str(), "w");
    }

    static void Write(FILE* pipe, const std::string& line) {
        std::fputs((line + "\n").c_str(), pipe);
        std::fflush(pipe);
    }

    std::string Said() const { return ContentOf(Data() + "/said"); }
};

TEST_F(SendLines, SendsEachLineAsItIs) {
    Listener listener;
    const std::string odd = " {\"createTime\" : 1700000000,  \"eventID\":\"B2\", \"more\":[]} \r";
    const auto outcome = Send(FileOf(Line(1) + "\n\n \t\r\n" + odd + "\n" + Line(3)));
    EXPECT_EQ(outcome.output, "sent 3 messages (138 bytes)\n");
    EXPECT_EQ(outcome.exitCode, 0);
    EXPECT_EQ(listener.Receive(), Line(1));
    EXPECT_EQ(listener.Receive(), odd);
    EXPECT_EQ(listener.Receive(), Line(3));
    EXPECT_TRUE(listener.IsEmpty());
}

TEST_F(SendLines, ReadsStandardInput) {
    Listener listener;
    for (const auto* arguments : {"-", "--file -", "--file=-"}) {
        const auto outcome = Send(arguments, "echo '" + Line(1) + "' |");
        EXPECT_EQ(outcome.output, "sent 1 message (40 bytes)\n");
        EXPECT_EQ(outcome.exitCode, 0);
        EXPECT_EQ(listener.Receive(), Line(1));
    }
    EXPECT_TRUE(listener.IsEmpty());
}

TEST_F(SendLines, TellsABadLineByItsNumberAndSendsTheOthers) {
    Listener listener;
    const auto outcome = Send(FileOf(Line(1) + "\n\n{\"a\"\n" + Line(4) + "\n{}\n"));
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_EQ(
        outcome.output,
        "error: line 3: it is not JSON: Missing a colon after a name of object member. At byte 4.\n"
        "error: line 5: it is no report (there is no \"eventID\" in it) and no control message that the "
        "service knows (its msgType is null, and must be \"init\" or \"updateOpenID\" to the letter): the "
        "service would ignore it\n"
        "sent 2 messages (80 bytes); left out 2 lines\n");
    EXPECT_EQ(listener.Receive(), Line(1));
    EXPECT_EQ(listener.Receive(), Line(4));
    EXPECT_TRUE(listener.IsEmpty());
}

TEST_F(SendLines, SendsBadLinesAnywayWhenAskedTo) {
    Listener listener;
    const auto outcome = Send(FileOf("{\"a\"\n" + std::string("x\0y\n", 4)) + "--anyway");
    EXPECT_EQ(outcome.exitCode, 0);
    EXPECT_EQ(outcome.output,
              "warning: line 1: it is not JSON: Missing a colon after a name of object member. At byte 4.\n"
              "warning: line 2: it holds a zero byte, and the service cuts a text off there: byte 1\n"
              "sent 2 messages (7 bytes)\n");
    EXPECT_EQ(listener.Receive(), "{\"a\"");
    EXPECT_EQ(listener.Receive(), std::string("x\0y", 3));
}

TEST_F(SendLines, SendsOnWhenALineIsTooLongEvenForTheSystem) {
    Listener listener;
    const auto outcome = Send(FileOf(std::string(70'000, 'x') + "\n" + Line(2)) + "--anyway");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_EQ(outcome.output,
              "warning: line 1: it has 70000 bytes, and the service cuts a text off after 10240\n"
              "error: line 1: Net Exception: Message too long\n"
              "sent 1 message (40 bytes); left out 1 line\n");
    EXPECT_EQ(listener.Receive(), Line(2));
}

TEST_F(SendLines, PrintsTheGoodLinesInADryRun) {
    Listener listener;
    const auto outcome = Send(FileOf(Line(1) + "\n[]\n" + Line(3)) + "--dry-run");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_EQ(outcome.output, Line(1) +
                                  "\nerror: line 2: it is JSON but no object: the service would find nothing "
                                  "in it\n" +
                                  Line(3) + "\ndry run: would send 2 messages (80 bytes); left out 1 line\n");
    EXPECT_TRUE(listener.IsEmpty());
}

TEST_F(SendLines, SendsTheOutputOfADryRun) {
    Listener listener;
    const auto outcome =
        Send("-", "'" REPORTCTL "' send --event B --dry-run --time 1700000000 2>/dev/null |");
    EXPECT_EQ(outcome.output, "sent 1 message (66 bytes)\n");
    EXPECT_EQ(listener.Receive(), R"({"eventID":"B","value":"","createTime":1700000000,"isDayReport":0})");
}

TEST_F(SendLines, StopsAtTheFirstLineWhenNobodyListens) {
    const auto outcome = Send(FileOf(Line(1) + "\n" + Line(2)));
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_EQ(outcome.output, std::string("error: line 1: ") + NO_LISTENER +
                                  "sent 0 messages (0 bytes); stopped at line 1\n");
}

TEST_F(SendLines, SendsALineAsSoonAsItIsWrittenAndStopsWhenTheListenerGoes) {
    // Before the listener's socket, because the program would inherit it and keep it open.
    FILE* const pipe = StartOnAPipe();
    ASSERT_NE(pipe, nullptr);
    {
        Listener listener;
        Write(pipe, Line(1));
        EXPECT_EQ(listener.Receive(), Line(1));
    }
    Write(pipe, Line(2));
    EXPECT_TRUE(WaitUntil([&] { return !Said().empty(); }));
    EXPECT_EQ(WEXITSTATUS(::pclose(pipe)), 1);
    EXPECT_EQ(Said(), std::string("error: line 2: ") + NO_LISTENER +
                          "sent 1 message (40 bytes); stopped at line 2\n");
}

TEST_F(SendLines, KeepsThePace) {
    Listener listener;
    std::string lines;
    for (int number = 1; number <= 21; ++number)
        lines += Line(number) + "\n";
    const auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(Send(FileOf(lines) + "--rate 100").exitCode, 0);
    // 20 intervals of 10 ms, minus 5 ms because a late line is followed by shorter intervals.
    EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(195));
}

TEST_F(SendLines, SaysThatItCannotReadAClosedInput) {
    const auto outcome = Send("- <&-", "timeout 10 env");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_EQ(outcome.output, "error: what was to be sent could not be read to its end\n"
                              "sent 0 messages (0 bytes)\n");
}

TEST_F(SendLines, SaysSoWhenItsWordsCannotBeWritten) {
    Listener listener;
    const auto outcome = Send(FileOf(Line(1)) + "2>&1 >/dev/full; }", "{");
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_EQ(outcome.output, "error: cannot write to standard output: No space left on device\n");
    EXPECT_EQ(listener.Receive(), Line(1)) << "sent all the same";
    std::string many;
    for (int number = 0; number < 1000; ++number)
        many += Line(number) + "\n";
    EXPECT_EQ(Send(FileOf(many) + "--dry-run >/dev/full").exitCode, 1)
        << "more than what is kept to be written";
}

TEST_F(SendLines, SaysWhatItCannotRead) {
    const auto missing = Send("--file /nowhere/lines");
    EXPECT_EQ(missing.exitCode, 1);
    EXPECT_EQ(missing.output, "error: cannot open /nowhere/lines: No such file or directory\n");
    const auto directory = Send("--file /tmp");
    EXPECT_EQ(directory.exitCode, 1);
    EXPECT_EQ(directory.output, "error: what was to be sent could not be read to its end\n"
                                "sent 0 messages (0 bytes)\n");
}

} // namespace
