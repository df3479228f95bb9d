#include "Tools/reportctl/forward/EndOfRun.h"

namespace reportctl::forward {

bool EndOfRun::IsOver(const Step& step, MetrikSdk::WallTime now) {
    if (step.kind == Step::Kind::Taken) {
        m_progress = now;
        m_inVain = 0;
        m_refusals = 0;
        return false;
    }
    m_hasFailed = IsInVain(step, now);
    return m_hasFailed || step.kind == Step::Kind::Idle;
}

bool EndOfRun::IsInVain(const Step& step, MetrikSdk::WallTime now) {
    if (step.kind == Step::Kind::Idle)
        return false;
    if (step.kind == Step::Kind::Trouble || now + step.pause > m_progress + PATIENCE)
        return true;
    if (step.kind == Step::Kind::Refused)
        return ++m_refusals >= MOST_REFUSALS;
    if (step.kind == Step::Kind::Searching)
        return false;
    return ++m_inVain >= MOST_IN_VAIN;
}

} // namespace reportctl::forward
