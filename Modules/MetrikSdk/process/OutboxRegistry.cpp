#include "Modules/MetrikSdk/process/OutboxRegistry.h"

#include <cstdlib>
#include <filesystem>
#include <system_error>
#include <utility>

namespace MetrikSdk::process {
namespace {

/// One name for each directory, whether it exists yet or not; empty for what can be none.
std::string Canonical(const std::string& directory) {
    if (directory.empty() || directory.front() != '/' || directory.find('\0') != std::string::npos)
        return {};
    std::error_code error;
    auto path = std::filesystem::weakly_canonical(directory, error).string();
    if (error)
        return {};
    while (path.size() > 1 && path.ends_with('/'))
        path.pop_back();
    return path;
}

} // namespace

OutboxRegistry::OutboxRegistry(const OutboxSettings& settings, otlp::LookUp lookUp)
    : m_settings(settings), m_lookUp(std::move(lookUp)),
      m_reporter(std::make_shared<report::FailureReporter>(settings.tellInterval)) {}

OutboxRegistry& OutboxRegistry::Instance() {
    static auto& instance =
        // NOLINTNEXTLINE(concurrency-mt-unsafe): nothing here changes the environment
        *new OutboxRegistry(OutboxSettings{}, [](const char* name) { return std::getenv(name); });
    return instance;
}

std::shared_ptr<OutboxEngine> OutboxRegistry::Acquire(const std::string& directory) {
    const std::lock_guard lock(m_mutex);
    ForgetReleased();
    const auto chosen = Choose(directory);
    if (chosen.empty())
        return nullptr;
    auto& known = m_engines[chosen];
    auto engine = known.lock();
    if (!engine) {
        std::vector<std::string> complaints;
        const auto endpoint = otlp::ReadEndpoint(m_lookUp, complaints);
        engine =
            std::make_shared<OutboxEngine>(chosen, m_settings, endpoint, std::move(complaints), m_reporter);
        known = engine;
    }
    return engine;
}

std::string OutboxRegistry::Choose(const std::string& directory) {
    const auto canonical = Canonical(directory);
    if (canonical.empty())
        return m_firstDirectory;
    if (m_firstDirectory.empty())
        m_firstDirectory = canonical;
    const bool isNew = !m_engines.contains(canonical);
    // The first directory's place is kept for it.
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
        m_reporter = std::make_shared<report::FailureReporter>(m_settings.tellInterval);
}

std::optional<std::string> OutboxRegistry::ReportNoDirectory() {
    return Report(report::Cause::Directory,
                  "No absolute database directory was given, neither now nor before: events of "
                  "this module are refused");
}

std::optional<std::string> OutboxRegistry::Report(report::Cause cause, const std::string& text) {
    const std::lock_guard lock(m_mutex);
    return m_reporter->Report(cause, text, std::chrono::steady_clock::now());
}

} // namespace MetrikSdk::process
