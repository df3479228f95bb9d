#pragma once

#include <deque>
#include <functional>
#include <string>
#include <vector>

#include "tests/fakes/FakeFactory.h"

/// What the fake database was asked, and what it answers.
struct FakeSqliteState : FakeFactory {
    struct Call {
        std::string operation;
        std::string argument; ///< The path or statement; a batch's statements joined by blanks.

        bool operator==(const Call&) const = default;
    };

    /// The next answer, the default one when the script is used up.
    bool Answer() {
        if (throwsIn.empty() || throwsIn == calls.back().operation)
            ThrowIf(throws);
        if (answers.empty())
            return answer;
        const bool next = answers.front();
        answers.pop_front();
        return next;
    }

    std::vector<Call> calls;
    std::function<void()> onExec; ///< Called by ExecSql before it answers.
    std::deque<bool> answers;
    bool answer = true;
    Throws throws = Throws::Nothing;
    std::string throwsIn; ///< The one operation that throws; empty for all.
    std::string errorText = "scripted error";
    std::vector<std::vector<std::string>> rows; ///< What a query appends.
    int count = 0; ///< What a counting statement stores; nothing is stored for a negative.
};

inline FakeSqliteState& FakeSqlite() {
    return FakeState<FakeSqliteState>("libOrvekSqlite.dylib");
}
