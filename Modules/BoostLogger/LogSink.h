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

/// The one sink of the process: a Boost.Log core that it keeps alive, and in it a sink whose backend writes
/// lines into the files.
///
/// Life: made by InitLog, and never destroyed. Threads log while exit() destroys the statics, Boost.Log's own
/// among them, in any order; the core lives on because this object holds it.
///
/// Threads: Write from any. It does not throw; what cannot be written is counted, and reported in the log
/// later.
class LogSink {
public:
    explicit LogSink(const LogSettings& settings);

    /// Opens the log and puts the sink into the core. Also when the log cannot be opened: the writer loses
    /// records then, and tries again for as long as there are any.
    FileFailure Start();

    /// Takes the sink out of the core: another one takes its place.
    void Retire();

    void Write(const LogRecord& record) noexcept;

private:
    const boost::log::core_ptr m_core;
    const boost::log::attribute_name m_attributeName;
    const boost::shared_ptr<LogBackend> m_backend;
    const boost::shared_ptr<boost::log::sinks::sink> m_sink;
};

} // namespace BoostLogger
