#pragma once

#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/fakes/FakeLogger.h"

/// Runs `operation` once for each kind of exception that `script` can throw. Expects false each time, and one
/// warning with the text that people search for. A `line` of 0 means any line, for a place that has no fixed
/// one.
template <typename Operation>
void ExpectEachKindOfExceptionToBeLogged(Throws& script, const std::string& file, const std::string& function,
                                         int line, Operation operation) {
    FakeLogger().Clear();
    for (const Throws kind : {Throws::Poco, Throws::Std, Throws::Other}) {
        script = kind;
        EXPECT_FALSE(operation());
    }
    script = Throws::Nothing;
    const std::vector<std::string> texts = {"Poco exception :I/O error: scripted ",
                                            "Std exception :scripted ", "Unknown exception :[0-9]+-.*"};
    const auto records = FakeLogger().Records();
    ASSERT_EQ(records.size(), texts.size());
    for (std::size_t i = 0; i < texts.size(); ++i) {
        const LogRecord& record = records[i];
        EXPECT_EQ(record, (LogRecord{3, file, function, line != 0 ? line : record.line, record.message}));
        EXPECT_THAT(record.message, ::testing::MatchesRegex(texts[i]));
    }
}
