#pragma once

#include <filesystem>
#include <string>

#include <gtest/gtest.h>

#include "Ledger/Reader.h"
#include "Ledger/Writer.h"
#include "tests/support/TemporaryDirectory.h"

/// A ledger's file in a directory of the test.
class LedgerFixture : public ::testing::Test {
protected:
    using Outcome = ReportLedger::Outcome;
    using Writer = ReportLedger::Writer;

    static constexpr std::int64_t NOW_MS = 1'760'000'000'000;

    /// Opens the ledger as the service does at its start.
    bool Open(Writer& writer, std::int64_t nowMs = NOW_MS) const {
        return writer.Open(Directory(), "1.2.3", "c0ffee", nowMs);
    }

    /// Counts what both threads count for a report of 100 bytes that is received and queued.
    static void Take(Writer& writer, std::int64_t nowMs = NOW_MS) {
        writer.Received(100, false, nowMs);
        writer.Queued();
    }
    static void TakeAndEnd(Writer& writer, Outcome outcome, std::int64_t nowMs = NOW_MS) {
        Take(writer, nowMs);
        writer.Ended(outcome, nowMs);
    }

    ReportLedger::Look Look() const { return ReportLedger::LookAt(Path()); }

    static std::uint64_t Of(const ReportLedger::Counts& counts, Outcome outcome) {
        return counts[static_cast<unsigned>(outcome)];
    }

    std::string Directory() const { return m_data.Path() + "/hublink/run"; }
    std::string Path() const { return Directory() + "/Report.ledger"; }
    std::string SetAside() const { return Path() + ".set-aside"; }

    TemporaryDirectory m_data;
};
