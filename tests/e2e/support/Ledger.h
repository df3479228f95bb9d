#pragma once

#include <chrono>
#include <ostream>
#include <set>
#include <string>
#include <vector>

#include "tests/e2e/support/Service.h"

/// Sends numbered reports for the store, and finds out how each ended: as a row, or as a line of the log with
/// its statement. It is for faults: during a fault, no marker can be stored that a test could wait for.
class Ledger {
public:
    using Numbers = std::set<int>;

    explicit Ledger(Service& service) : m_service(service) {}

    /// Sends this many reports, no faster than the service takes them from its socket.
    void Report(int count = 1);

    /// Sends one report at a time until one becomes a row. True when that was before the deadline.
    bool ReportUntilOneIsStored(std::chrono::milliseconds deadline = std::chrono::seconds(20));

    /// Sends one report at a time until one is logged as lost. True when that was before the deadline.
    bool ReportUntilOneIsLost(std::chrono::milliseconds deadline = std::chrono::seconds(20));

    /// Waits until each number from `first` on has become a row or a line of the log.
    bool AwaitEachStoredOrLogged(int first = 0);

    /// The number of the next report.
    int Next() const { return m_next; }

    /// The numbers in the store. When one is there twice or out of order, the test fails and the result is
    /// empty.
    Numbers Stored() const;

    /// A report whose statement failed. `error` is the text before the statement.
    struct LostOne {
        int number;
        std::string error;
        std::string statement;

        friend void PrintTo(const LostOne& lost, std::ostream* out) {
            *out << lost.number << ": " << lost.error << '-' << lost.statement;
        }
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
