#pragma once

#include <chrono>
#include <filesystem>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "tests/e2e/support/Service.h"

/// The real service in an empty working directory, and what must still be true after the hostile datagrams.
class HostileFixture : public ::testing::Test {
protected:
    HostileFixture();
    ~HostileFixture() override;

    /// Sends without overrunning the socket, so that each one is received.
    void Send(const std::string& datagram);

    /// The next report is stored in time, the store and the outbox have got so many rows and events and are
    /// sound, the log is one line for each record, the ledger has them all, and neither memory nor
    /// descriptors nor threads nor files have grown.
    void ExpectSoundness(std::int64_t rows, std::int64_t events);

    /// An empty directory that the service was started in.
    const std::string& WorkingDirectory() const { return m_workingDirectory.Path(); }

    Service m_service;

private:
    /// What is counted before and after.
    struct Possessions {
        std::vector<std::string> schema;   ///< Of both databases.
        std::vector<std::string> baseInfo; ///< The rows of the store's second table.
        std::vector<std::string> files;    ///< In the data directory.
        std::size_t descriptors = 0;
        std::vector<pid_t> threads;
    };
    Possessions WhatIsThere() const;
    void HaveABurstStored();

    void ExpectTheNextReportIsStored();
    void ExpectSoundDatabases(std::int64_t rows, std::int64_t events);
    void ExpectOneLineForEachRecord();
    void ExpectTrueLedger();
    void ExpectNothingHasGrown();

    TemporaryDirectory m_workingDirectory;
    std::filesystem::path m_returnTo;
    std::string m_output; ///< Of the set-up.
    Possessions m_before;
    std::int64_t m_rowsBefore = 0;
    std::size_t m_sent = 0;
    std::size_t m_unread = 0; ///< Bytes that may still be in the socket.
};
