#pragma once

#include <chrono>
#include <filesystem>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "tests/e2e/support/Service.h"

/// The real service in an empty working directory, and the checks after the hostile datagrams.
class HostileFixture : public ::testing::Test {
protected:
    HostileFixture();
    ~HostileFixture() override;

    /// Sends no faster than the socket can take, so that each datagram is received.
    void Send(const std::string& datagram);

    /// Expects that the next report is stored in time; that the store has got this many rows and the outbox
    /// this many events, and both are sound; that the log has one line for each record; that the ledger
    /// counts all; and that memory, descriptors, threads and files have not grown.
    void ExpectSoundness(std::int64_t rows, std::int64_t events);

    /// An empty directory that the service was started in.
    const std::string& WorkingDirectory() const { return m_workingDirectory.Path(); }

    Service m_service;

private:
    /// What is compared before and after.
    struct Possessions {
        std::vector<std::string> schema;   ///< The schemas of both databases.
        std::vector<std::string> baseInfo; ///< The rows of the store's second table.
        std::vector<std::string> files;    ///< The files in the data directory.
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
    std::string m_output; ///< The output of the set-up.
    Possessions m_before;
    std::int64_t m_rowsBefore = 0;
    std::size_t m_sent = 0;
    std::size_t m_unread = 0; ///< Bytes that may still be in the socket.
};
