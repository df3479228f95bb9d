#include "tests/Client/EventsInCProcess.h"

#include <array>
#include <cstring>
#include <stdexcept>
#include <string>

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

EventsInCProcess::EventsInCProcess() {
    std::array<int, 2> to{};
    std::array<int, 2> from{};
    if (::pipe2(to.data(), O_CLOEXEC) != 0 || ::pipe2(from.data(), O_CLOEXEC) != 0)
        throw std::runtime_error("no pipes");
    m_process = ::fork();
    if (m_process == 0) {
        ::dup2(to[0], STDIN_FILENO);
        ::dup2(from[1], STDOUT_FILENO);
        ::execl(SSR_EVENTS_IN_C, SSR_EVENTS_IN_C, nullptr);
        ::_exit(127);
    }
    ::close(to[0]);
    ::close(from[1]);
    m_to = to[1];
    m_from = from[0];
}

EventsInCProcess::~EventsInCProcess() {
    ::close(m_to); // the process ends at the end of its input
    ::close(m_from);
    ::waitpid(m_process, nullptr, 0);
}

hublink::Result EventsInCProcess::Send(const RandomEvent& event) const {
    constexpr std::array KINDS = {'n', 't', 'j'};
    const std::array<std::uint32_t, 2> lengths{static_cast<std::uint32_t>(event.id.size()),
                                               static_cast<std::uint32_t>(event.value.size())};
    std::string order(1, KINDS[static_cast<std::size_t>(event.kind)]);
    order.append(reinterpret_cast<const char*>(lengths.data()), sizeof lengths);
    order += event.id + event.value;
    char result = 0;
    if (::write(m_to, order.data(), order.size()) != static_cast<ssize_t>(order.size()) ||
        ::read(m_from, &result, 1) != 1)
        throw std::runtime_error("events_in_c ended: " + std::string(std::strerror(errno)));
    return static_cast<hublink::Result>(result);
}
