#pragma once

#include <chrono>
#include <set>
#include <string>
#include <vector>

#include "tests/e2e/support/Service.h"

/// Numbered reports for the store, and what became of each: a row, or a line of the log with its statement.
/// Made for faults, in which no marker can be stored to wait for.
class Ledger {
public:
    using Numbers = std::set<int>;

    explicit Ledger(Service& service) : m_service(service) {}

    /// Sends so many, no faster than the service takes them from its socket.
    void Report(int count = 1);

    /// Sends one at a time until one becomes a row; whether that was before the deadline.
    bool ReportUntilOneIsStored(std::chrono::milliseconds deadline = std::chrono::seconds(20));

    /// Sends one at a time until one is logged as lost.
    bool ReportUntilOneIsLost(std::chrono::milliseconds deadline = std::chrono::seconds(20));

    /// Waits until each number from `first` on has become a row or a line of the log.
    bool AwaitEachStoredOrLogged(int first = 0);

    /// The number of the next report.
    int Next() const { return m_next; }

    /// Those in the store, which are there once and in their order; none, and a failure, when they are not.
    Numbers Stored() const;

    /// Those whose statement failed, with the error text before the statement.
    struct LostOne {
        int number;
        std::string error;
        std::string statement;
    };
    std::vector<LostOne> Lost() const;
    Numbers LostNumbers() const;

    /// The numbers from `first` to the one before `end`.
    static Numbers Range(int first, int end);

private:
    bool IsHandled(int number) const;

    Service& m_service;
    int m_next = 0;
};
