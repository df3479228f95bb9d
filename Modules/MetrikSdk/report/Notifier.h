#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "Modules/MetrikSdk/report/FailureReporter.h"
#include "Modules/MetrikSdk/report/News.h"
#include "Plugin/IMetrikSdk.h"

namespace MetrikSdk::report {

/// Calls the callbacks of all modules that share an outbox. Thousands of modules usually have the same
/// function, which is then called once.
///
/// Threads: any. A callback runs while the notifier's lock is held. So after Unsubscribe returned, no call to
/// it is running or will come. A callback may report events, but must not initialise or destroy an SDK
/// object. The end of failures goes to the failure callback, too, because the texts of that callback end in a
/// log.
/// Failure: an exception of a callback is ignored. When there is no memory for reporting a failure, it is not
/// reported, because the caller is in the middle of handling it.
class Notifier {
public:
    explicit Notifier(std::shared_ptr<FailureReporter> reporter) : m_reporter(std::move(reporter)) {}

    /// Makes a reporter of its own, which limits only this notifier.
    explicit Notifier(std::chrono::milliseconds tellInterval)
        : Notifier(std::make_shared<FailureReporter>(tellInterval)) {}

    /// Null functions are allowed, and are not called. One Unsubscribe undoes one Subscribe.
    void Subscribe(IMetrikSdk::Callback onFailure, IMetrikSdk::Callback onSuccess);
    void Unsubscribe(IMetrikSdk::Callback onFailure, IMetrikSdk::Callback onSuccess);

    void TellFailure(const News& news) noexcept;
    void TellFailure(Cause cause, const char* text) noexcept;
    void TellFailures(const std::vector<News>& news) noexcept;
    void TellSuccess(const std::string& what, const std::string& detail);

    /// From now on, no callback of this process is called: exit() is running, and may have destroyed what the
    /// callbacks use.
    static void Silence();

private:
    using Subscribers = std::map<IMetrikSdk::Callback, int>;

    std::optional<std::string> Words(const News& news);
    static void Tell(const Subscribers& subscribers, const std::string& what, const std::string& detail);

    /// Guards all below. It is recursive, because a callback may report an event, and that event may fail,
    /// too.
    std::recursive_mutex m_mutex;
    const std::shared_ptr<FailureReporter> m_reporter;
    Subscribers m_onFailure;
    Subscribers m_onSuccess;
};

} // namespace MetrikSdk::report
