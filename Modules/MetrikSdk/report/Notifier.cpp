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
    try {
        Add(m_onSuccess, onSuccess);
    } catch (...) { // either both are added or none
        Take(m_onFailure, onFailure);
        throw;
    }
}

void Notifier::Unsubscribe(IMetrikSdk::Callback onFailure, IMetrikSdk::Callback onSuccess) {
    const std::lock_guard lock(m_mutex);
    Take(m_onFailure, onFailure);
    Take(m_onSuccess, onSuccess);
}

void Notifier::TellFailure(const News& news) noexcept {
    try {
        const std::lock_guard lock(m_mutex);
        if (const auto words = Words(news))
            Tell(m_onFailure, NameOf(news.cause), *words);
    } catch (...) { // no memory for the text
    }
}

void Notifier::TellFailure(Cause cause, const char* text) noexcept {
    try {
        TellFailure(News{cause, text});
    } catch (...) { // as above
    }
}

/// The text to report; nothing when it is not to be reported now.
std::optional<std::string> Notifier::Words(const News& news) {
    if (news.kind == News::Kind::Failure)
        return m_reporter->RecordFailure(news.cause, news.text, std::chrono::steady_clock::now());
    const bool isDue = m_reporter->ReportEnd(news.cause) || news.kind == News::Kind::Totals;
    return isDue ? std::optional(news.text) : std::nullopt;
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
        } catch (...) { // an exception of a callback must not end the uploader's thread
        }
    }
}

} // namespace MetrikSdk::report
