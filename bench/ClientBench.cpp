#include <array>
#include <cstdio>
#include <ctime>
#include <optional>
#include <stdexcept>
#include <string>

#include <arpa/inet.h>
#include <benchmark/benchmark.h>
#include <hublink/report.hpp>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

// What a report costs the program that sends it, in processor time of the sending thread. To compare: a bare
// sendto of the same bytes, which is the least that any program needs, and what programs do instead of
// reporting: a counter for a metrics daemon, and a line for the local syslog. A socket receives each of them,
// with room for all. bench/client runs it.
namespace {

constexpr int BATCH = 50; // datagrams in the listener's socket at once; more than these would fit

sockaddr_in Loopback(std::uint16_t port) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    return address;
}

/// A socket that receives what the benchmark sends.
class Listener {
public:
    template <typename Address>
    Listener(int family, const Address& address) : m_socket(::socket(family, SOCK_DGRAM | SOCK_NONBLOCK, 0)) {
        if (::bind(m_socket, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0)
            throw std::runtime_error("the address is taken: run it as bench/client does");
    }
    ~Listener() { ::close(m_socket); }
    Listener(const Listener&) = delete;
    Listener& operator=(const Listener&) = delete;

    /// Takes all datagrams out. Returns the last one.
    std::string Drain() const {
        std::array<char, 16'384> buffer{};
        std::string last;
        for (ssize_t bytes = 0; (bytes = ::recv(m_socket, buffer.data(), buffer.size(), 0)) >= 0;)
            last.assign(buffer.data(), static_cast<std::size_t>(bytes));
        return last;
    }

private:
    const int m_socket;
};

double ThreadSeconds() {
    timespec now{};
    ::clock_gettime(CLOCK_THREAD_CPUTIME_ID, &now);
    return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) * 1e-9;
}

/// Times `send`, one batch at a time. After each batch, the listener takes the datagrams out, which is not
/// timed.
template <typename Send>
void TimeSending(benchmark::State& state, const Listener& listener, Send send) {
    for (auto _ : state) {
        const double begin = ThreadSeconds();
        for (int i = 0; i < BATCH; ++i)
            send();
        state.SetIterationTime(ThreadSeconds() - begin);
        listener.Drain();
    }
    state.SetItemsProcessed(state.iterations() * BATCH);
}

const std::string TEXT = "the document 'letter to the committee.txt' was saved in the editor, by the user";
const hublink::Json JSON{
    R"({"button":"save","page":"editor","count":3,"ratio":1.5,"text":"as people write it"})"};

void SendEvent(benchmark::State& state, const hublink::Value& value) {
    const Listener listener(AF_INET, Loopback(9997));
    hublink::Reporter reporter;
    TimeSending(state, listener, [&] { benchmark::DoNotOptimize(reporter.Event("B100|10001", value)); });
    if (reporter.Count(hublink::Result::Sent) == 0)
        state.SkipWithError("no event was sent");
}

void EventWithText(benchmark::State& state) {
    SendEvent(state, TEXT);
}

void EventWithJson(benchmark::State& state) {
    SendEvent(state, JSON);
}

/// The same bytes, which were made before.
void SendBare(benchmark::State& state, const hublink::Value& value) {
    const Listener listener(AF_INET, Loopback(9997));
    hublink::Reporter().Event("B100|10001", value);
    const std::string datagram = listener.Drain();
    const sockaddr_in service = Loopback(9997);
    const int socket = ::socket(AF_INET, SOCK_DGRAM, 0);
    TimeSending(state, listener, [&] {
        ::sendto(socket, datagram.data(), datagram.size(), 0, reinterpret_cast<const sockaddr*>(&service),
                 sizeof service);
    });
    ::close(socket);
}

void BareSendtoOfText(benchmark::State& state) {
    SendBare(state, TEXT);
}

void BareSendtoOfJson(benchmark::State& state) {
    SendBare(state, JSON);
}

/// A counter as clients of metrics daemons send it: formatted and sent over UDP, and nothing more.
void StatsdCounter(benchmark::State& state) {
    const sockaddr_in daemon = Loopback(8125);
    const Listener listener(AF_INET, daemon);
    const int socket = ::socket(AF_INET, SOCK_DGRAM, 0);
    int count = 0;
    TimeSending(state, listener, [&] {
        std::array<char, 128> text{};
        const int length = std::snprintf(text.data(), text.size(), "%s.%s:%d|c|#page:%s", "painter", "clicks",
                                         ++count, "editor");
        ::sendto(socket, text.data(), static_cast<std::size_t>(length), MSG_DONTWAIT,
                 reinterpret_cast<const sockaddr*>(&daemon), sizeof daemon);
    });
    ::close(socket);
}

/// A log line of the same text. The receiving socket neither formats nor stores it.
void LocalSyslog(benchmark::State& state) {
    sockaddr_un daemon{};
    daemon.sun_family = AF_UNIX;
    std::snprintf(daemon.sun_path, sizeof daemon.sun_path, "/dev/log");
    {
        const Listener listener(AF_UNIX, daemon);
        ::openlog("painter", LOG_PID | LOG_NDELAY, LOG_USER);
        // A socket of this family holds ten lines. The eleventh would wait for room.
        for (auto _ : state) {
            const double begin = ThreadSeconds();
            for (int i = 0; i < 10; ++i)
                ::syslog(LOG_INFO, "%s %s", "B100|10001", TEXT.c_str());
            state.SetIterationTime(ThreadSeconds() - begin);
            if (listener.Drain().empty())
                state.SkipWithError("no line arrived");
        }
        state.SetItemsProcessed(state.iterations() * 10);
        ::closelog();
    }
    ::unlink(daemon.sun_path);
}

} // namespace

BENCHMARK(BareSendtoOfText)->UseManualTime();
BENCHMARK(EventWithText)->UseManualTime();
BENCHMARK(BareSendtoOfJson)->UseManualTime();
BENCHMARK(EventWithJson)->UseManualTime();
BENCHMARK(StatsdCounter)->UseManualTime();
BENCHMARK(LocalSyslog)->UseManualTime();
