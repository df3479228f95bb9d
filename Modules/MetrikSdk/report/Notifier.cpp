#include "Modules/MetrikSdk/report/Notifier.h"

#include <atomic>

namespace MetrikSdk::report {
namespace {

std::atomic<bool> g_silent = false;

void Add(std::map<IMetrikSdk::Callback, int>& subscribers, IMetrikSdk::Callback callback) {
    if (callback != nullptr)
        ++subscribers[callback];
}

void Take(std::map<IMetrikSdk::Callback, int>& subscribers, IMetrikSdk::Callback callback) {
    const auto found = subscribers.find(callback);
    if (found != subscribers.end() && --found->second == 0)
        subscribers.erase(found);
}

} // namespace

void Notifier::Subscribe(IMetrikSdk::Callback onFailure, IMetrikSdk::Callback onSuccess) {
    const std::lock_guard lock(m_mutex);
    Add(m_onFailure, onFailure);
    Add(m_onSuccess, onSuccess);
}

void Notifier::Unsubscribe(IMetrikSdk::Callback onFailure, IMetrikSdk::Callback onSuccess) {
    const std::lock_guard lock(m_mutex);
    Take(m_onFailure, onFailure);
    Take(m_onSuccess, onSuccess);
}

void Notifier::TellFailure(News news) noexcept {
    try {
        const std::lock_guard lock(m_mutex);
        if (IsTold(news))
            Tell(m_onFailure, NameOf(news.cause), news.text);
    } catch (...) { // no memory for the text
    }
}

/// Whether it is told now, and then in which words.
bool Notifier::IsTold(News& news) {
    if (news.kind == News::Kind::End)
        return m_reporter->ReportEnd(news.cause);
    const auto text = m_reporter->RecordFailure(news.cause, news.text, std::chrono::steady_clock::now());
    news.text = text.value_or("");
    return text.has_value();
}

void Notifier::TellFailures(const std::vector<News>& news) noexcept {
    for (const auto& one : news)
        TellFailure(one);
}

void Notifier::TellSuccess(const std::string& what, const std::string& detail) {
    const std::lock_guard lock(m_mutex);
    Tell(m_onSuccess, what, detail);
}

void Notifier::Silence() {
    g_silent = true;
}

void Notifier::Tell(const Subscribers& subscribers, const std::string& what, const std::string& detail) {
    for (const auto& [callback, count] : subscribers) {
        if (g_silent)
            return;
        try {
            callback(what, detail);
        } catch (...) { // a stranger's exception must not end the uploader's thread
        }
    }
}

} // namespace MetrikSdk::report
