#pragma once

namespace ReportLedger {

/// How a report ended. Its number is its counter's place in the ledger (Layout.h).
enum class Outcome : unsigned {
    Stored = 8,        ///< The store took it.
    ToAnalytics,       ///< The SDK took it.
    Control,           ///< A control message of a known kind.
    OtherControl,      ///< A control message of a kind that is ignored.
    NotJson,           ///< Report or control message that cannot be parsed.
    Store,             ///< The store refused the statement.
    NoStore,           ///< There is no store: its plug-in is missing.
    ModuleNotInit,     ///< Of a module that did not announce itself.
    EventIdWithoutBar, ///< Begins with the letter of an event for analytics, and names no module.
    ValueNotJson,      ///< Of an event for analytics.
    Analytics,         ///< There is no SDK, or it said no.
    Exception,         ///< An exception cost the report.
};

/// Names how the report under way on this thread ends, at the place that knows it. The first call counts: the
/// code nearest to the failure calls first, and its callers, which see only its result, call later. Has no
/// lasting effect while no report is under way.
void Ended(Outcome outcome) noexcept;

class Writer;

/// One report's stay on the consuming thread: when this goes, the ledger counts what was named meanwhile. A
/// report of which nothing was named was cut short: it counts as an exception.
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
