#pragma once

#include <atomic>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "Modules/MetrikSdk/otlp/EndpointConfig.h"
#include "Modules/MetrikSdk/process/OutboxCore.h"
#include "Modules/MetrikSdk/upload/Uploader.h"

namespace MetrikSdk::process {

/// Everything that this process has for one database directory: the outbox, the callbacks, and the uploader
/// when there is an endpoint. Destruction stops the uploader, within a second (see Uploader). Threads: any.
class OutboxEngine {
public:
    OutboxEngine(const std::string& directory, const OutboxSettings& settings,
                 const std::optional<otlp::EndpointConfig>& endpoint, std::vector<std::string> complaints,
                 std::shared_ptr<report::FailureReporter> reporter);

    /// Opens the outbox file. Also reports what was wrong with the configuration: before, there was no
    /// callback to report it to.
    bool Open();

    outbox::Outbox& Events() { return m_core->outbox; }
    report::Notifier& Listeners() { return m_core->notifier; }

private:
    void StartUploader(const otlp::EndpointConfig& endpoint);

    std::shared_ptr<OutboxCore> m_core;
    std::vector<std::string> m_complaints;        ///< Constant after construction.
    std::atomic<bool> m_complained = false;       ///< They were reported, to the first module.
    std::unique_ptr<upload::Uploader> m_uploader; ///< Null: events stay in the outbox.
};

} // namespace MetrikSdk::process
