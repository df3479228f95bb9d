#pragma once

namespace ReportLedger {

/// How a report ended. The value is the place of its counter in the ledger (Layout.h).
enum class Outcome : unsigned {
    Stored = 8,        ///< The store took it.
    ToAnalytics,       ///< The SDK took it.
    Control,           ///< A control message of a known kind.
    OtherControl,      ///< A control message of a kind that is ignored.
    NotJson,           ///< A report or control message that cannot be parsed.
    Store,             ///< The store refused the statement.
    NoStore,           ///< There is no store: its plug-in is missing.
    ModuleNotInit,     ///< The report's module did not announce itself.
    EventIdWithoutBar, ///< The event id begins like one for analytics, but names no module.
    ValueNotJson,      ///< The value of an event for analytics is no JSON.
    Analytics,         ///< There is no SDK, or it refused the event.
    Exception,         ///< The report was lost by an exception.
};

/// Names how the report that this thread handles ends. It is called where the cause is known. Only the first
/// call counts: the code nearest to a failure calls first, and its callers, which know only the result, call
/// later. While no report is handled, a call has no lasting effect.
void Ended(Outcome outcome) noexcept;

class Writer;

/// Exists while the consuming thread handles one report. The destructor counts the outcome that was named
/// meanwhile. When none was named, the handling was interrupted, and the report counts as an exception.
class Handling {
public:
    explicit Handling(Writer& ledger) noexcept;
    ~Handling();
    Handling(const Handling&) = delete;
    Handling& operator=(const Handling&) = delete;

private:
    Writer& m_ledger;
};

} // namespace ReportLedger
