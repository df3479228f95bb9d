#pragma once

#include <algorithm>
#include <cstddef>

namespace MetrikSdk::upload {

/// How many events go into the next request while one that the collector refuses is searched for. Batches are
/// always the oldest events, so a number is all that has to be remembered. Pure.
///
/// A refused request of n events is followed by its halves in turn; a refused half by its own, until one
/// event is left, which is the bad one. Once everything that was under suspicion is gone, batches are full
/// again.
class BatchSplitter {
public:
    explicit BatchSplitter(std::size_t maxEvents) : m_max(maxEvents), m_limit(maxEvents) {}

    std::size_t Limit() const { return m_limit; }

    /// The request of `sent` events was refused. True when that was a single event: it is the bad one.
    bool Refused(std::size_t sent) {
        if (sent <= 1)
            return true;
        m_suspects = sent;
        m_limit = (sent + 1) / 2;
        return false;
    }

    /// `gone` events have left the head of the outbox: delivered, or found to be bad.
    void Gone(std::size_t gone) {
        m_suspects -= std::min(gone, m_suspects);
        m_limit = m_suspects == 0 ? m_max : std::min(m_limit, m_suspects);
    }

    /// The one bad event was found; others, if there are any, show in the next full batch.
    void Found() {
        m_suspects = 0;
        m_limit = m_max;
    }

private:
    std::size_t m_max;
    std::size_t m_limit;
    std::size_t m_suspects = 0;
};

} // namespace MetrikSdk::upload
