#include <array>
#include <chrono>

#include <Poco/Net/SocketAddress.h>
#include <benchmark/benchmark.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include "App/UDPServer.h"
#include "Common/Wire.h"
#include "bench/Report.h"

// One datagram from the socket to a text. The datagrams already wait in the socket, so this is the most that
// the receiving thread can do.
namespace {

constexpr int WAITING = 100; // the kernel's default buffer holds more than these

class Receiver final : public UDPServer {
public:
    Receiver() { m_socket.bind(Poco::Net::SocketAddress("127.0.0.1", 0), true); }

    Poco::Net::DatagramSocket& Socket() { return m_socket; }

    bool Recv(const std::string& msg) override {
        benchmark::DoNotOptimize(msg.data());
        if (++m_received == WAITING)
            StopSelf();
        return true;
    }

private:
    int m_received = 0;
};

class BareReceiver {
public:
    Poco::Net::DatagramSocket& Socket() { return m_socket; }

    void run() {
        const int file = m_socket.impl()->sockfd();
        for (int i = 0; i < WAITING; ++i) {
            const auto bytes = ::recvfrom(file, m_buffer.data(), m_buffer.size(), 0, nullptr, nullptr);
            const std::string text(m_buffer.data(), static_cast<std::size_t>(bytes));
            benchmark::DoNotOptimize(text.data());
        }
    }

private:
    Poco::Net::DatagramSocket m_socket{Poco::Net::SocketAddress("127.0.0.1", 0)};
    std::array<char, Wire::MAX_BYTES> m_buffer{};
};

template <typename AnyReceiver>
void Datagram(benchmark::State& state) {
    Poco::Net::DatagramSocket sender(Poco::Net::SocketAddress("127.0.0.1", 0));
    const std::string report = ReportOf180Bytes();
    for (auto _ : state) {
        AnyReceiver receiver;
        for (int i = 0; i < WAITING; ++i)
            sender.sendTo(report.data(), static_cast<int>(report.size()), receiver.Socket().address());
        const auto begin = std::chrono::steady_clock::now();
        receiver.run();
        state.SetIterationTime(
            std::chrono::duration<double>(std::chrono::steady_clock::now() - begin).count());
    }
    state.SetItemsProcessed(state.iterations() * WAITING);
}

} // namespace

BENCHMARK(Datagram<BareReceiver>)->UseManualTime();
BENCHMARK(Datagram<Receiver>)->UseManualTime();
