#pragma once

#include <chrono>
#include <cstddef>

#include "Modules/BoostLogger/LogRecord.h"
#include "SystemTool/Text/LineBuffer.h"

namespace BoostLogger {

using SystemTool::Text::LineBuffer;
using SystemTool::Text::TextOf;

/// A longer message is cut. The largest datagram has 10 KiB, so longer messages do not belong in a log.
inline constexpr std::size_t MAX_MESSAGE_BYTES = std::size_t{64} * 1024;

/// Appends the whole line of `record`, with its newline:
///   2026-11-20 10:15:30.123 INFO  [pid:tid] [App/ReportServer:42 Recv] message
/// The time is local time. A tag that is not empty follows the function as " #tag".
void ComposeLine(LineBuffer& line, const LogRecord& record, std::chrono::system_clock::time_point now);

} // namespace BoostLogger
