#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <string>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/otlp/Sender.h"
#include "Modules/MetrikSdk/upload/RetryPolicy.h"
#include "Modules/MetrikSdk/upload/UploadRules.h"
#include "Tools/reportctl/forward/RowQueue.h"
#include "Tools/reportctl/forward/Teller.h"

namespace reportctl::forward {

/// What one pass came to, and what to wait for before the next one.
struct Step {
    enum class Kind {
        Idle,        ///< There is nothing to send.
        Taken,       ///< Rows were taken.
        Refused,     ///< A row will not be sent any more, because the collector refuses it.
        Searching,   ///< Not taken; the next request tells more about which row is to blame.
        Unreachable, ///< Not taken, which has nothing to do with the rows.
        Trouble      ///< The store, or our own file, could not be read or written.
    };
    Kind kind = Kind::Idle;
    std::chrono::milliseconds pause{0};
};

/// Sends the store's rows, one request a pass, and does with the answer what the uploader of events does:
/// every decision is UploadRules'. No clock of its own: the caller passes the time and sleeps.
///
/// Threads: one. Failure: told, and a Step of its own; nothing is lost.
class Forwarder {
public:
    /// All of them outlive this object. `random` is uniform in [0, 1).
    Forwarder(RowQueue& queue, MetrikSdk::otlp::Sender& sender, Teller& teller,
              const MetrikSdk::OutboxSettings& settings, std::function<double()> random);

    Step Pass(MetrikSdk::WallTime now);

    /// At the end of a run: what failed in it counts as one try, if anything was taken.
    void EndRun();

    struct Counts {
        std::int64_t sent = 0;    ///< Taken by the collector.
        std::int64_t refused = 0; ///< Not to be sent any more.
    };
    const Counts& Done() const { return m_done; }

    /// Why the last request was not taken; empty when it was.
    const std::string& LastFailure() const { return m_lastFailure; }

private:
    using Rules = MetrikSdk::upload::UploadRules;

    Step Advance(MetrikSdk::WallTime now);
    Step Send(MetrikSdk::Batch batch, bool isAside, MetrikSdk::WallTime now);
    std::string EncodeWithinBound(MetrikSdk::Batch& batch) const;
    Step::Kind Act(const MetrikSdk::Batch& batch, const Rules::Sent& sent,
                   const MetrikSdk::otlp::HttpResult& result, const Rules::Decision& decision,
                   MetrikSdk::WallTime now);
    void Taken(const MetrikSdk::Batch& batch, const MetrikSdk::otlp::HttpResult& result);
    void Refuse(const MetrikSdk::Batch& batch, const Rules::Sent& sent, long status,
                const std::string& reason);
    void NotTaken(const MetrikSdk::Batch& batch, const MetrikSdk::otlp::HttpResult& result,
                  MetrikSdk::WallTime now);
    void StaysAside(const MetrikSdk::Batch& batch, const Rules::Sent& sent,
                    const MetrikSdk::otlp::HttpResult& result, const Rules::Decision& decision);
    void TellWhatTheQueueFound();
    std::string Describe(const MetrikSdk::otlp::HttpResult& result) const;

    RowQueue& m_queue;
    MetrikSdk::otlp::Sender& m_sender;
    Teller& m_teller;
    const MetrikSdk::OutboxSettings m_settings;
    std::function<double()> m_random;
    Rules m_rules;
    Counts m_done;
    std::string m_lastFailure;
};

} // namespace reportctl::forward
