#include "Ledger/Outcome.h"

#include <optional>

#include "Ledger/Writer.h"
#include "SystemTool/Platform.h"

namespace ReportLedger {
namespace {

/// Of the report under way. The thread's own, so that no class has to hand it through its prescribed results.
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
