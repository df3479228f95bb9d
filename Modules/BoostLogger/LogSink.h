#pragma once

#include <boost/log/attributes/attribute_name.hpp>
#include <boost/log/core/core.hpp>
#include <boost/log/sinks/sink.hpp>
#include <boost/smart_ptr/shared_ptr.hpp>

#include "Modules/BoostLogger/FileFailure.h"
#include "Modules/BoostLogger/LogRecord.h"
#include "Modules/BoostLogger/LogSettings.h"

namespace BoostLogger {

class LogBackend;

/// The one sink of the process. It holds the core of Boost.Log, and in that core a sink whose backend writes
/// lines into the files.
///
/// Life: made by InitLog, and never destroyed. Threads still log while exit() destroys the static objects,
/// those of Boost.Log among them, in any order. The core lives on because this object holds it.
///
/// Threads: any may call Write. It does not throw. Records that cannot be written are counted, and a later
/// record reports their number.
class LogSink {
public:
    explicit LogSink(const LogSettings& settings);

    /// Opens the log and puts the sink into the core. It does the latter also when the log cannot be opened.
    /// Then the writer counts records as lost, and tries again to open the log for as long as records come.
    FileFailure Start();

    /// Takes the sink out of the core. To be called when another sink has taken its place.
    void Retire();

    void Write(const LogRecord& record) noexcept;

    /// Call this when the process ends; see LogWriter::Finish.
    void Finish() noexcept;

private:
    const boost::log::core_ptr m_core;
    const boost::log::attribute_name m_attributeName;
    const boost::shared_ptr<LogBackend> m_backend;
    const boost::shared_ptr<boost::log::sinks::sink> m_sink;
};

} // namespace BoostLogger
