#include "Modules/MetrikSdk/process/OutboxRegistry.h"

#include <cstdlib>
#include <new>
#include <utility>

#include "Modules/MetrikSdk/upload/StartSpread.h"
#include "Modules/Sqlite/SafeDirectory.h"
#include "SystemTool/CommonTool.h"
#include "SystemTool/Text/Utf8.h"

namespace MetrikSdk::process {
namespace {

constexpr std::size_t MAX_TOLD_BYTES = 1024; ///< The most bytes of a path, or of a reason, in a message.

std::string Shown(const std::string& text) {
    return std::string(SystemTool::Text::CutUtf8(text, MAX_TOLD_BYTES));
}

} // namespace

OutboxRegistry::OutboxRegistry(const OutboxSettings& settings, otlp::LookUp lookUp,
                               DataDirectory dataDirectory)
    : m_settings(settings), m_lookUp(std::move(lookUp)), m_dataDirectory(std::move(dataDirectory)),
      m_reporter(std::make_shared<report::FailureReporter>(settings.tellInterval)) {}

OutboxRegistry& OutboxRegistry::Instance() {
    // NOLINTNEXTLINE(concurrency-mt-unsafe): nothing here changes the environment
    const auto environment = [](const char* name) { return std::getenv(name); };
    static auto& instance =
        *new OutboxRegistry(OutboxSettings{}, environment, &SystemTool::CommonTool::GetUserDataDir);
    return instance;
}

std::shared_ptr<OutboxEngine> OutboxRegistry::Acquire(const std::string& directory) {
    std::string refusal;
    return Acquire(directory, refusal);
}

std::shared_ptr<OutboxEngine> OutboxRegistry::Acquire(const std::string& directory, std::string& refusal) {
    const std::lock_guard lock(m_mutex);
    ForgetReleased();
    auto settings = m_settings;
    settings.file.dataDirectory = m_dataDirectory();
    const auto chosen = Choose(Accepted(directory, settings.file.dataDirectory, refusal));
    if (chosen.empty())
        return nullptr;
    auto& known = m_engines[chosen];
    auto engine = known.lock();
    if (!engine) {
        std::vector<std::string> complaints;
        const auto endpoint = otlp::ReadEndpoint(m_lookUp, complaints);
        if (endpoint) {
            settings.resource = otlp::ReadResource(m_lookUp, complaints);
            if (const auto spread = upload::ReadStartSpread(m_lookUp, complaints))
                settings.retry.startSpread = *spread;
        }
        engine =
            std::make_shared<OutboxEngine>(chosen, settings, endpoint, std::move(complaints), m_reporter);
        known = engine;
    }
    return engine;
}

/// The canonical path of the directory. Empty, with the reason in `refusal`, when the directory must not be
/// used.
std::string OutboxRegistry::Accepted(const std::string& directory, const std::string& dataDirectory,
                                     std::string& refusal) {
    try {
        if (!directory.empty())
            return Sqlite::SafeDirectory::Resolve(directory, dataDirectory);
    } catch (const std::bad_alloc&) { // a lack of memory says nothing about the directory
        throw;
    } catch (const std::exception& error) {
        refusal = "The directory " + Shown(directory) + " is not used: " + Shown(error.what());
    }
    return {};
}

std::string OutboxRegistry::Choose(const std::string& canonical) {
    if (canonical.empty())
        return m_firstDirectory;
    if (m_firstDirectory.empty())
        m_firstDirectory = canonical;
    const bool isNew = !m_engines.contains(canonical);
    // One place is always kept for the first directory.
    const auto taken = m_engines.size() + (m_engines.contains(m_firstDirectory) ? 0 : 1);
    return isNew && canonical != m_firstDirectory && taken >= MAX_OUTBOXES ? m_firstDirectory : canonical;
}

void OutboxRegistry::ForgetReleased() {
    std::erase_if(m_engines, [](const auto& entry) { return entry.second.expired(); });
}

void OutboxRegistry::Release(std::shared_ptr<OutboxEngine>& engine) {
    const std::lock_guard lock(m_mutex);
    engine.reset();
    ForgetReleased();
    if (m_engines.empty())
        ForgetWhatWasTold();
}

/// The next outbox is a new beginning, so every failure may be reported anew. This is part of the destruction
/// of modules, so it must also work without memory.
void OutboxRegistry::ForgetWhatWasTold() noexcept {
    try {
        m_reporter = std::make_shared<report::FailureReporter>(m_settings.tellInterval);
    } catch (const std::bad_alloc&) { // then the old reporter stays, with its limit on reports
    }
}

std::optional<std::string> OutboxRegistry::ReportNoDirectory() {
    return RecordFailure(report::Cause::Directory,
                         "No absolute database directory was given, neither now nor before: events of "
                         "this module are refused");
}

std::optional<std::string> OutboxRegistry::RecordFailure(report::Cause cause, const std::string& text) {
    const std::lock_guard lock(m_mutex);
    return m_reporter->RecordFailure(cause, text, std::chrono::steady_clock::now());
}

} // namespace MetrikSdk::process
