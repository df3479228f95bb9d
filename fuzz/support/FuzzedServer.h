#pragma once

#include <iostream>
#include <memory>

#include <Poco/Net/SocketAddress.h>

#include "App/ReportServer.h"
#include "tests/fakes/FakeSdk.h"

/// The service without its port and its threads. A text is received, queued and consumed on the target's
/// thread, one after the other. Needs the fake SDK beside the program.
class FuzzedServer final : public SyncServiceReport::ReportServer {
public:
    FuzzedServer() {
        // A socket can be bound only once. So Start does not get the service's port, prints an error, and
        // starts no receiving thread, whose end would take 250 ms.
        m_socket.bind(Poco::Net::SocketAddress("127.0.0.1", 0));
        std::streambuf* const output = std::cout.rdbuf(nullptr);
        Start();
        std::cout.rdbuf(output);
        StopThread();
        m_modules = FakeSdk().created;
        m_openID = GetBaseInfo().openID;
        m_suiteVersion = GetBaseInfo().suiteVersion;
    }

    /// Takes the queued text out of the queue.
    std::string Dequeued() {
        const Poco::AutoPtr<Poco::Notification> item(m_queue.dequeueNotification());
        const auto* work = dynamic_cast<const WorkNotification<std::string>*>(item.get());
        return work != nullptr ? work->m_data : "(nothing was queued)";
    }
    bool IsQueueEmpty() const { return m_queue.empty(); }

    /// Whether the texts that it consumed change how it handles later ones.
    bool HasChanged() const {
        return FakeSdk().created != m_modules || GetBaseInfo().openID != m_openID ||
               GetBaseInfo().suiteVersion != m_suiteVersion;
    }

private:
    int m_modules = 0;
    std::string m_openID;
    std::string m_suiteVersion;
};

/// A server for each input, so that the input's file alone is enough to repeat a finding. A server that an
/// input did not change serves the next input, too, because to make a new one takes longer than most inputs.
class ServerPerInput {
public:
    FuzzedServer& Next() {
        if (m_server == nullptr || m_server->HasChanged()) {
            m_server.reset(); // the old server must end before the new one begins, as in the real service
            m_server = std::make_unique<FuzzedServer>();
        }
        return *m_server;
    }

private:
    FakeSdkState& m_sdk = FakeSdk(); ///< Loaded before the server, so that the fake outlives it.
    std::unique_ptr<FuzzedServer> m_server;
};
