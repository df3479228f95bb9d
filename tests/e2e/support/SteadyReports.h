#pragma once

#include <atomic>
#include <chrono>
#include <functional>
#include <string>
#include <thread>
#include <utility>

#include "tests/e2e/support/Service.h"

/// Sends reports at a fixed rate on a thread of its own, until Stop.
class SteadyReports {
public:
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
    static constexpr int RATE = 200; // reports a second; a program with a sanitizer is much slower
#else
    static constexpr int RATE = 2'000;
#endif
    using Text = std::function<std::string(int number)>;

    explicit SteadyReports(Text text) : m_text(std::move(text)), m_thread([this] { Run(); }) {}
    ~SteadyReports() {
        Stop();
    }
    SteadyReports(const SteadyReports&) = delete;
    SteadyReports& operator=(const SteadyReports&) = delete;

    /// Stops sending. Returns how many reports were sent.
    int Stop() {
        m_stop = true;
        if (m_thread.joinable())
            m_thread.join();
        return m_sent;
    }

private:
    void Run() {
        const auto begin = std::chrono::steady_clock::now();
        for (; !m_stop; ++m_sent) {
            std::this_thread::sleep_until(begin + std::chrono::microseconds(1'000'000LL * m_sent / RATE));
            Service::Send(m_text(m_sent));
        }
    }

    Text m_text;
    std::atomic<bool> m_stop = false;
    int m_sent = 0;
    std::thread m_thread;
};
