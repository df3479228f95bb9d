#include "hublink/report.hpp"

#include <atomic>
#include <cstddef>
#include <new>
#include <utility>

#include "EventRules.h"
#include "Inside.h"
#include "wire/Datagram.h"

namespace hublink {
Reporter::Inside::Inside(const Module& module, const Options& options)
    : m_module(module.id), m_channel(options) {
    if (m_module.empty())
        return;
    wire::Datagram datagram;
    const Result isWritten = WriteAnnouncement(datagram.Buffer(), module);
    m_channel.SetModule(std::string(datagram.Text()), isWritten);
}

Result Reporter::Inside::Event(const GivenEvent& event) noexcept {
    const auto module = ModuleOf(event.id, m_module);
    if (!module)
        return Result::InvalidEventId;
    wire::Datagram datagram;
    const Result isWritten = WriteEvent(datagram.Buffer(), event);
    return isWritten == Result::Sent
               ? m_channel.Send(datagram.Text(), !module->empty() && *module == m_module)
               : isWritten;
}

Result Reporter::Inside::SetUser(std::string_view openId, std::string_view suiteVersion) noexcept {
    try {
        return m_channel.SetUser(openId, suiteVersion);
    } catch (const std::bad_alloc&) {
        return Result::SystemError;
    }
}

Result Reporter::Inside::Count(Result result) noexcept {
    m_counts[static_cast<std::size_t>(result)].fetch_add(1, std::memory_order_relaxed);
    return result;
}

std::uint64_t Reporter::Inside::CountOf(Result result) const noexcept {
    const auto place = static_cast<std::size_t>(result);
    return place < m_counts.size() ? m_counts[place].load(std::memory_order_relaxed) : 0;
}

Reporter::Reporter() noexcept : Reporter(Module()) {}

Reporter::Reporter(const Module& module, const Options& options) noexcept {
    try {
        m_inside = std::make_unique<Inside>(module, options);
    } catch (const std::bad_alloc&) { // every call returns SystemError then
    }
}

Reporter::~Reporter() = default;

Result Reporter::Event(std::string_view eventId, Value value, std::optional<Time> time,
                       bool isDayReport) noexcept {
    if (m_inside == nullptr)
        return Result::SystemError;
    return m_inside->Count(
        m_inside->Event({eventId, value, time ? *time : std::chrono::system_clock::now(), isDayReport}));
}

Result Reporter::SetUser(std::string_view openId, std::string_view suiteVersion) noexcept {
    return m_inside == nullptr ? Result::SystemError
                               : m_inside->Count(m_inside->SetUser(openId, suiteVersion));
}

std::uint64_t Reporter::Count(Result result) const noexcept {
    return m_inside == nullptr ? 0 : m_inside->CountOf(result);
}

} // namespace hublink
