#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <set>
#include <sstream>

#include <Poco/Net/DatagramSocket.h>
#include <Poco/Net/SocketAddress.h>
#include <Poco/Timespan.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/e2e/support/Service.h"
#include "tests/support/ModeOf.h"
#include "tests/support/WaitUntil.h"

using ::testing::ElementsAre;
using ::testing::IsSupersetOf;

// Who may read the files that the program makes, and who can send to it.

namespace {

constexpr int PORT = 9997;

/// The local addresses of the UDP sockets that have the report port, IPv4 and IPv6, as the kernel writes
/// them.
std::vector<std::string> AddressesWithThePort() {
    std::vector<std::string> addresses;
    for (const char* family : {"/proc/net/udp", "/proc/net/udp6"}) {
        std::ifstream table(family);
        for (std::string line; std::getline(table, line);) {
            std::string slot, local;
            std::istringstream(line) >> slot >> local;
            if (local.ends_with(":270D"))
                addresses.push_back(local);
        }
    }
    return addresses;
}

void SendTo(const std::string& host, const std::string& text) {
    Poco::Net::DatagramSocket socket;
    socket.sendTo(text.data(), static_cast<int>(text.size()), Poco::Net::SocketAddress(host, PORT));
}

class Rights : public ::testing::Test {
protected:
    Rights() {
        m_service.Install();
        m_service.Start();
    }

    /// Sends so much that the log begins a second file.
    void FillALogFile() {
        const std::string report = R"({"eventID":"B1","value":")" + std::string(10'000, 'x') + "\"}";
        for (int i = 0; i < 1100; ++i) {
            ASSERT_TRUE(WaitUntil([] { return Service::TookAllDatagrams(); }));
            Service::Send(report);
        }
    }

    Service m_service;
};

} // namespace

TEST_F(Rights, WhatItMakesIsItsUsersAlone) {
    const std::string other = m_service.DataDirectory() + "/other/place";
    Service::Send(R"({"msgType":"init","exdata":{"moduleID":"A100","dbPath":")" + other + "\"}}");
    for (const std::string module : {"A759", "A100", "B1"})
        Service::Send(R"({"eventID":")" + module + "|1\"}");
    FillALogFile();
    m_service.AwaitQuiet();

    std::set<std::string> seen;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(m_service.DataDirectory())) {
        seen.insert(entry.path().lexically_relative(m_service.DataDirectory()).string());
        EXPECT_EQ(ModeOf(entry.path()), entry.is_directory() ? 0700U : 0600U) << entry.path();
    }
    EXPECT_THAT(seen,
                IsSupersetOf({"hublink/log/metrik/Report.log", "hublink/log/metrik/Report_1.log",
                              "hublink/database/Report.db", "hublink/database/Report.db-wal",
                              "hublink/database/Report.db-shm", "hublink/database/MetrikOutbox.db",
                              "hublink/database/MetrikOutbox.db-wal", "hublink/database/MetrikOutbox.db-shm",
                              "other", "other/place", "other/place/MetrikOutbox.db",
                              "other/place/MetrikOutbox.db-wal", "other/place/MetrikOutbox.db-shm"}));
    EXPECT_EQ(ModeOf(Service::PID_FILE), 0666U) << "which each user's service locks in turn";
}

TEST_F(Rights, TheOneSocketIsBoundToLoopback) {
    EXPECT_THAT(AddressesWithThePort(), ElementsAre("0100007F:270D"));
}

TEST_F(Rights, ADatagramToAnotherAddressOfTheMachineIsNotReceived) {
    ASSERT_EQ(std::system("ip address add 10.1.2.3/32 dev lo"), 0); // the sandbox's device
    for (const std::string host : {"10.1.2.3", "127.0.0.2"})
        SendTo(host, R"({"eventID":"B1"})");
    m_service.AwaitQuiet();
    EXPECT_EQ(m_service.RowCount(), 0);
    EXPECT_EQ(m_service.LogLines("App/ReportServer:42 Recv").size(), 1U) << "that of the marker";

    for (const std::string host : {"10.1.2.3", "127.0.0.2"}) { // a socket at that address does receive it
        Poco::Net::DatagramSocket there(Poco::Net::SocketAddress(host, PORT));
        SendTo(host, "x");
        EXPECT_TRUE(there.poll(Poco::Timespan(10, 0), Poco::Net::Socket::SELECT_READ)) << host;
    }
}
