#include "Ledger/Outcome.h"

#include <optional>

#include "Ledger/Writer.h"
#include "SystemTool/Platform.h"

namespace ReportLedger {
namespace {

/// The outcome of the report that this thread handles. It is thread-local so that no function has to return
/// it beside its own result.
thread_local std::optional<Outcome> t_outcome;

} // namespace

void Ended(Outcome outcome) noexcept {
    if (!t_outcome)
        t_outcome = outcome;
}

Handling::Handling(Writer& ledger) noexcept : m_ledger(ledger) {
    t_outcome.reset();
}

Handling::~Handling() {
    m_ledger.Ended(t_outcome.value_or(Outcome::Exception), SystemTool::Platform::CoarseTimeMs());
}

} // namespace ReportLedger
