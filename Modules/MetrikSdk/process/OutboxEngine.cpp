#include "Modules/MetrikSdk/process/OutboxEngine.h"

#include <cstdlib>
#include <system_error>
#include <utility>

#include "Modules/MetrikSdk/otlp/HttpSender.h"

namespace MetrikSdk::process {
namespace {

/// exit() may be called while the uploader is at work, also by the service's crash handler on any thread.
/// After this function, exit() destroys the logger behind the callbacks and the TLS library's state. Neither
/// may be in use then.
void OnExit() {
    report::Notifier::Silence();
    otlp::HttpSender::AbandonAll(std::chrono::milliseconds(500));
}

/// OnExit is registered after the TLS library has registered its own function, so OnExit runs before it.
void RegisterOnExit() {
    [[maybe_unused]] static const int registered = std::atexit(&OnExit);
}

std::string Joined(const std::vector<std::string>& texts) {
    std::string joined;
    for (const auto& text : texts)
        joined += (joined.empty() ? "" : "; ") + text;
    return joined;
}

} // namespace

OutboxEngine::OutboxEngine(const std::string& directory, const OutboxSettings& settings,
                           const std::optional<otlp::EndpointConfig>& endpoint,
                           std::vector<std::string> complaints,
                           std::shared_ptr<report::FailureReporter> reporter)
    : m_core(std::make_shared<OutboxCore>(directory, settings, std::move(reporter))),
      m_complaints(std::move(complaints)) {
    if (endpoint)
        StartUploader(*endpoint);
    RegisterOnExit();
}

void OutboxEngine::StartUploader(const otlp::EndpointConfig& endpoint) {
    try {
        m_uploader = std::make_unique<upload::Uploader>(m_core, std::make_shared<otlp::HttpSender>(endpoint));
    } catch (const std::exception& error) { // events are stored all the same
        m_complaints.push_back(std::string("The uploader cannot be started: ") + error.what());
    }
}

bool OutboxEngine::Open() {
    if (!m_complaints.empty() && !m_complained.exchange(true))
        // All complaints are one text: a second text would be kept back as a repetition of the first.
        m_core->notifier.TellFailure({report::Cause::Configuration, Joined(m_complaints)});
    return m_core->outbox.Open();
}

} // namespace MetrikSdk::process
