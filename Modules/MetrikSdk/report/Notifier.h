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

/// Tells the callbacks of all modules that share an outbox. Thousands of modules usually bring the same
/// function, which is then called once.
///
/// Threads: any. A callback runs while the notifier's lock is held, so that after Unsubscribe no call to it
/// is under way or will come; it may report events, but not initialise or destroy an SDK object.
/// The end of failures goes to the failure callback too: it is the one whose texts end in a log.
/// Failure: what a callback throws goes nowhere, and a failure that cannot be told for lack of memory is
/// not told: the caller is in the middle of handling it.
class Notifier {
public:
    explicit Notifier(std::shared_ptr<FailureReporter> reporter) : m_reporter(std::move(reporter)) {}

    /// With a limit of its own.
    explicit Notifier(std::chrono::milliseconds tellInterval)
        : Notifier(std::make_shared<FailureReporter>(tellInterval)) {}

    /// Null functions are allowed, and are not called. Each call is undone by one Unsubscribe.
    void Subscribe(IMetrikSdk::Callback onFailure, IMetrikSdk::Callback onSuccess);
    void Unsubscribe(IMetrikSdk::Callback onFailure, IMetrikSdk::Callback onSuccess);

    void TellFailure(const News& news) noexcept;
    void TellFailure(Cause cause, const char* text) noexcept;
    void TellFailures(const std::vector<News>& news) noexcept;
    void TellSuccess(const std::string& what, const std::string& detail);

    /// From now on no callback of this process is called: exit() is running, and what the callbacks use may
    /// be destroyed already.
    static void Silence();

private:
    using Subscribers = std::map<IMetrikSdk::Callback, int>;

    std::optional<std::string> Words(const News& news);
    static void Tell(const Subscribers& subscribers, const std::string& what, const std::string& detail);

    /// Guards all below. Recursive, because a callback may come back with an event that fails in its turn.
    std::recursive_mutex m_mutex;
    const std::shared_ptr<FailureReporter> m_reporter;
    Subscribers m_onFailure;
    Subscribers m_onSuccess;
};

} // namespace MetrikSdk::report
