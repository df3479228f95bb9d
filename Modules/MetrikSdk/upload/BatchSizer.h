#pragma once

#include <cstddef>
#include <limits>
#include <optional>

namespace MetrikSdk::upload {

/// A request as far as its size goes.
struct RequestSize {
    std::size_t events = 0;
    std::size_t bodyBytes = 0; ///< Before compression.
};

/// What a request that was not taken says about its batch.
enum class Blame {
    Event,    ///< At least one event of it will never be taken.
    TooLarge, ///< The body is longer than the collector reads.
    NoAnswer, ///< It timed out, or the connection broke: perhaps it is too much for the line.
    Later     ///< "Not now", which a collector also says for ever to an event that it cannot digest.
};

/// How many events go into the next request. Batches are always the oldest events, so numbers are all that
/// has to be remembered. Pure.
///
/// A request that fails is followed by its halves in turn, a failing half by its own, until one event is
/// left. What comes of such a search:
///
///     one event was to blame      batches are as large again as before the search
///     all were taken in parts     refused before: the refusal was a passing one, and batches are as before
///                                 no answer, or "later": the size was to blame. The size that worked is remembered; it
///                                 doubles up to half of what failed, and grows by an eighth after eight full requests
///
/// The first "later" halves nothing: it is about the collector, usually. The longest body that a collector
/// reads is known once it has refused one: later bodies stay below, starting with half of it.
class BatchSizer {
public:
    static constexpr std::size_t UNKNOWN = std::numeric_limits<std::size_t>::max();

    explicit BatchSizer(std::size_t maxEvents) : m_max(maxEvents), m_now{maxEvents, maxEvents} {}

    /// At least 1.
    std::size_t MaxEvents() const;

    /// Of a request of more than one event; UNKNOWN as long as no body was too long.
    std::size_t MaxBodyBytes() const { return m_maxBody; }

    /// The request failed. Whether it was one event alone, so that the caller must decide about that.
    bool Failed(const RequestSize& sent, Blame blame);

    /// The request's events were taken.
    void Taken(const RequestSize& sent);

    /// The event that was sent alone is to blame, and has left the head of the outbox.
    void Found();

    /// The event that was sent alone has left the head of the outbox for now. It is to blame if the next
    /// request is taken.
    void SteppedAside() { m_suspectIsAside = true; }

private:
    struct Limits {
        std::size_t events;  ///< Of one request.
        std::size_t doubles; ///< Up to here the former doubles with each request that is taken.
    };

    void Shrink(std::size_t sent, Blame blame);
    void LearnTooLong(std::size_t bodyBytes);
    void Grow(std::size_t sent);
    void GrowBody(std::size_t bodyBytes);
    bool Searching() const { return m_before.has_value(); }

    std::size_t m_max;
    Limits m_now;
    std::optional<Limits> m_before; ///< Of the search that is under way.
    std::size_t m_span = 0;     ///< Events of the request that began it, as far as they are not taken yet.
    std::size_t m_suspects = 0; ///< The same of the last request that failed.
    bool m_sizeIsSuspected = false;
    bool m_suspectIsAside = false;
    bool m_failing = false; ///< The last request failed.
    int m_laters = 0;
    int m_fullRequests = 0;
    int m_fullBodies = 0;
    std::size_t m_maxBody = UNKNOWN;
    std::size_t m_tooLong = UNKNOWN; ///< The shortest body that was refused for its length.
};

} // namespace MetrikSdk::upload
