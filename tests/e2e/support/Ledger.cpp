#include "tests/e2e/support/Ledger.h"

#include <algorithm>
#include <sstream>

#include <Poco/RegularExpression.h>
#include <gtest/gtest.h>

#include "tests/support/WaitUntil.h"

namespace {

/// Fewer datagrams than the smallest usual socket buffer holds.
constexpr int PORTION = 50;

int NumberOf(const std::string& eventId) {
    return std::stoi(eventId.substr(eventId.find('|') + 1));
}

} // namespace

void Ledger::Report(int count) {
    for (int i = 0; i < count; ++i) {
        Service::Send(R"({"eventID":"B1|)" + std::to_string(m_next++) +
                      R"(","value":{"text":"as people write it"}})");
        if (i % PORTION == PORTION - 1)
            WaitUntil([] { return Service::TookAllDatagrams(); });
    }
}

bool Ledger::ReportUntilOneIsStored(std::chrono::milliseconds deadline) {
    return WaitUntil(
        [&] {
            Report();
            WaitUntil([&] { return IsHandled(m_next - 1); }, std::chrono::seconds(1)); // the log may fail too
            return Stored().contains(m_next - 1);
        },
        deadline);
}

bool Ledger::ReportUntilOneIsLost(std::chrono::milliseconds deadline) {
    return WaitUntil(
        [&] {
            Report();
            return !Lost().empty();
        },
        deadline);
}

bool Ledger::AwaitEachStoredOrLogged(int first) {
    return WaitUntil(
        [&] {
            Numbers handled = Stored();
            handled.merge(LostNumbers());
            return std::ranges::includes(handled, Range(first, m_next));
        },
        std::chrono::seconds(60));
}

bool Ledger::IsHandled(int number) const {
    return Stored().contains(number) || LostNumbers().contains(number);
}

Ledger::Numbers Ledger::Stored() const {
    std::vector<int> rows;
    for (const auto& eventId : m_service.Rows("eventID"))
        rows.push_back(NumberOf(eventId));
    EXPECT_TRUE(std::ranges::is_sorted(rows));
    const Numbers numbers(rows.begin(), rows.end());
    EXPECT_EQ(numbers.size(), rows.size()) << "one is there twice";
    return numbers;
}

std::vector<Ledger::LostOne> Ledger::Lost() const {
    static const Poco::RegularExpression FORM(
        R"(Frame/DBHelper:\d+ ExecSql\] (.*)-(insert into OperLog .* values\('B1\|(\d+)'.*)$)");
    std::vector<LostOne> lost;
    std::istringstream log(m_service.Log());
    std::vector<std::string> parts;
    for (std::string line; std::getline(log, line);)
        if (FORM.split(line, parts) == 4)
            lost.push_back({std::stoi(parts[3]), parts[1], parts[2]});
    return lost;
}

Ledger::Numbers Ledger::LostNumbers() const {
    Numbers numbers;
    for (const auto& one : Lost())
        numbers.insert(one.number);
    return numbers;
}

Ledger::Numbers Ledger::Range(int first, int end) {
    Numbers numbers;
    for (int number = first; number < end; ++number)
        numbers.insert(number);
    return numbers;
}
