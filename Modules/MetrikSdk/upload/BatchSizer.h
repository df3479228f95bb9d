#pragma once

#include <cstddef>
#include <limits>
#include <optional>

namespace MetrikSdk::upload {

/// The size of a request.
struct RequestSize {
    std::size_t events = 0;
    std::size_t bodyBytes = 0; ///< Before compression.
};

/// What a request that was not taken says about its batch.
enum class Blame {
    Event,    ///< At least one event of it will never be taken.
    TooLarge, ///< The body is longer than the collector reads.
    NoAnswer, ///< The request timed out, or the connection broke: perhaps it is too long for the line.
    Later     ///< "Not now". A collector may also say this for ever to an event that it cannot process.
};

/// Decides how many events go into the next request. Batches always hold the oldest events, so this class
/// only has to remember numbers. Pure.
///
/// After a request that fails, its halves are sent one after the other. A half that fails is halved again,
/// until one event is left. The results of such a search:
///
/// - One event was to blame: batches are as large again as before the search.
/// - All events were taken in parts, after a refusal: the refusal was temporary, and batches are as large as
///   before.
/// - All events were taken in parts, after no answer or "later": the size was to blame. The size that worked
///   is remembered. It doubles up to half of the size that failed, and then grows by an eighth after eight
///   full requests.
///
/// The first "later" halves nothing, because it is usually about the collector. After a collector has refused
/// a body as too long, later bodies stay shorter, starting with half of its length.
class BatchSizer {
public:
    static constexpr std::size_t UNKNOWN = std::numeric_limits<std::size_t>::max();

    explicit BatchSizer(std::size_t maxEvents) : m_max(maxEvents), m_now{maxEvents, maxEvents} {}

    /// How many events the next request may have; at least 1.
    std::size_t MaxEvents() const;

    /// The limit for a request of more than one event; UNKNOWN as long as no body was too long.
    std::size_t MaxBodyBytes() const { return m_maxBody; }

    /// The request failed. Returns true when it had only one event, so that the caller must decide about that
    /// event.
    bool Failed(const RequestSize& sent, Blame blame);

    /// The events of the request were taken.
    void Taken(const RequestSize& sent);

    /// The event that was sent alone is to blame, and has left the front of the outbox.
    void Found();

    /// The event that was sent alone has left the front of the outbox for now. It is to blame if the next
    /// request is taken.
    void SteppedAside() { m_suspectIsAside = true; }

private:
    struct Limits {
        std::size_t events;  ///< How many events one request may have.
        std::size_t doubles; ///< `events` doubles up to this number, with each request that is taken.
    };

    void Shrink(std::size_t sent, Blame blame);
    void LearnTooLong(std::size_t bodyBytes);
    void Grow(std::size_t sent);
    void GrowBody(std::size_t bodyBytes);
    bool Searching() const { return m_before.has_value(); }

    std::size_t m_max;
    Limits m_now;
    std::optional<Limits> m_before; ///< The limits before the search that is going on.
    /// Events of the request that began the search, without those that were taken since.
    std::size_t m_span = 0;
    std::size_t m_suspects = 0; ///< The same for the last request that failed.
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
