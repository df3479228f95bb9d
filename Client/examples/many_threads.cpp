// Several threads share one reporter: any thread may use it at any time. At the end, the reporter's counters
// say how many events were sent, and how many were not.
#include <cstdint>
#include <cstdio>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include <hublink/report.hpp>

namespace {

constexpr int THREADS = 4;
constexpr int EVENTS = 25; // that each thread sends
constexpr std::uint64_t ALL_EVENTS = std::uint64_t{THREADS} * EVENTS;

void Work(hublink::Reporter& reporter, int thread) {
    for (int i = 0; i < EVENTS; ++i)
        reporter.Event("B100|10002", "thread " + std::to_string(thread) + ", step " + std::to_string(i));
}

} // namespace

int main() {
    hublink::Reporter reporter;
    std::vector<std::thread> threads;
    threads.reserve(THREADS);
    for (int thread = 0; thread < THREADS; ++thread)
        threads.emplace_back(Work, std::ref(reporter), thread);
    for (auto& thread : threads)
        thread.join();
    for (const auto result :
         {hublink::Result::Sent, hublink::Result::NobodyListens, hublink::Result::WouldBlock})
        std::printf("%s: %llu\n", hublink::ToString(result),
                    static_cast<unsigned long long>(reporter.Count(result)));
    return reporter.Count(hublink::Result::Sent) == ALL_EVENTS ? 0 : 1;
}
