#pragma once

#include <deque>
#include <functional>
#include <string>
#include <vector>

#include "tests/fakes/FakeFactory.h"

/// The calls that the fake database received, and what it answers.
struct FakeSqliteState : FakeFactory {
    struct Call {
        std::string operation;
        /// The path or statement. For a batch, the statements with blanks between them.
        std::string argument;

        bool operator==(const Call&) const = default;
    };

    /// The next answer of the script; after its end, the default answer.
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
    std::string throwsIn; ///< The only operation that throws; when empty, all do.
    std::string errorText = "scripted error";
    std::vector<std::vector<std::string>> rows; ///< What a query appends.
    int count = 0; ///< What a counting statement stores; a negative number means that it stores nothing.
};

inline FakeSqliteState& FakeSqlite() {
    return FakeState<FakeSqliteState>("libOrvekSqlite.dylib");
}
