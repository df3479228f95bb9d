#include "Modules/BoostLogger/LogSink.h"

#include <cerrno>
#include <chrono>
#include <mutex>

#include <unistd.h>

#include <boost/log/attributes/attribute_value_impl.hpp>
#include <boost/log/attributes/attribute_value_set.hpp>
#include <boost/log/attributes/value_extraction.hpp>
#include <boost/log/core/record.hpp>
#include <boost/log/sinks/basic_sink_backend.hpp>
#include <boost/log/sinks/unlocked_frontend.hpp>
#include <boost/make_shared.hpp>

#include "Modules/BoostLogger/LogWriter.h"
#include "Modules/BoostLogger/RecordLine.h"

namespace BoostLogger {

namespace logging = boost::log;

namespace {

/// Carries a whole record through the core of Boost.Log. It is one attribute, not one for each field, because
/// every attribute takes an allocation and a look-up per record.
using Payload = const LogRecord*;

const char* const PAYLOAD_NAME = "BoostLoggerRecord";

constexpr int INFORMATION = 2;

/// Warnings, failures and crash traces are written at once, together with the lines that wait. They explain
/// the end of a process, which often follows them.
LogWriter::Haste HasteOf(const LogRecord& record) {
    return record.level <= INFORMATION ? LogWriter::Haste::MayWait : LogWriter::Haste::AtOnce;
}

/// Copies lines to standard output. Failures are ignored: there is nowhere to report them to.
class Console {
public:
    void Write(std::string_view line) {
        const std::lock_guard lock(m_mutex);
        while (!line.empty()) {
            const ssize_t written = write(STDOUT_FILENO, line.data(), line.size());
            if (written < 0 && errno == EINTR)
                continue;
            if (written <= 0)
                return;
            line.remove_prefix(static_cast<std::size_t>(written));
        }
    }

private:
    std::mutex m_mutex; ///< Keeps lines whole when a terminal takes a line in several pieces.
};

} // namespace

/// Boost.Log takes no lock around this backend. Many threads compose lines at once, and only the write is
/// locked.
class LogBackend : public logging::sinks::basic_sink_backend<logging::sinks::concurrent_feeding> {
public:
    explicit LogBackend(const LogSettings& settings) : m_writer(settings), m_console(settings.console) {}

    LogWriter& Writer() { return m_writer; }

    void consume(const logging::record_view& view) {
        const auto payload = view.attribute_values()[m_attributeName].extract<Payload>();
        // a record of another user of Boost.Log in this process; the filter should have dropped it
        if (!payload)
            return;
        LineBuffer line;
        ComposeLine(line, **payload, std::chrono::system_clock::now());
        m_writer.Append(TextOf(line), std::chrono::steady_clock::now(), HasteOf(**payload));
        if (m_console)
            m_toConsole.Write(TextOf(line));
    }

private:
    const logging::attribute_name m_attributeName{PAYLOAD_NAME};
    LogWriter m_writer;
    const bool m_console;
    Console m_toConsole;
};

namespace {

boost::shared_ptr<logging::sinks::sink> SinkOf(const boost::shared_ptr<LogBackend>& backend,
                                               const logging::attribute_name& payload) {
    const auto sink = boost::make_shared<logging::sinks::unlocked_sink<LogBackend>>(backend);
    sink->set_filter([payload](const logging::attribute_value_set& values) {
        return values.find(payload) != values.end();
    });
    return sink;
}

} // namespace

LogSink::LogSink(const LogSettings& settings)
    : m_core(logging::core::get()), m_attributeName(PAYLOAD_NAME),
      m_backend(boost::make_shared<LogBackend>(settings)), m_sink(SinkOf(m_backend, m_attributeName)) {}

FileFailure LogSink::Start() {
    const FileFailure failure = m_backend->Writer().Start();
    m_core->add_sink(m_sink);
    return failure;
}

void LogSink::Retire() {
    m_core->remove_sink(m_sink);
}

void LogSink::Finish() noexcept {
    m_backend->Writer().Finish();
}

void LogSink::Write(const LogRecord& record) noexcept {
    try {
        logging::attribute_value_set values(1);
        values.insert(m_attributeName, logging::attributes::make_attribute_value(Payload(&record)));
        if (auto opened = m_core->open_record(boost::move(values)))
            m_core->push_record(boost::move(opened));
    } catch (...) { // out of memory
        m_backend->Writer().CountLost();
    }
}

} // namespace BoostLogger
