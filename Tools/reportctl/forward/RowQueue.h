#pragma once

#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/upload/UploadRules.h"
#include "Tools/reportctl/forward/State.h"
#include "Tools/reportctl/forward/StoreReader.h"

namespace reportctl::forward {

/// The store's rows as the queue that the uploader's rules ask: what is new, in the order of the ids; and
/// when there is nothing new, what is held, one row at a time. A row that stepped aside is held from the
/// moment on at which a later one was sent.
///
/// What a request came to is kept in mind until State has it, so that a state that cannot be written for now
/// has no row sent twice.
///
/// Threads: one. Failure: as StoreReader and State.
class RowQueue : public MetrikSdk::upload::EventQueue {
public:
    RowQueue(const StoreReader& reader, State& state, const MetrikSdk::BatchSettings& settings);

    MetrikSdk::upload::QueueHead TakeOldest(std::size_t maxEvents,
                                            const MetrikSdk::EventKeys& without) override;
    bool TakeOne(const MetrikSdk::EventKey& key) override;
    bool HasOthersThan(const MetrikSdk::EventKeys& these) override;

    /// The first `count` rows of what was looked at last. `now` is when they were observed.
    MetrikSdk::Batch TakeBatch(std::size_t count, MetrikSdk::WallTime now);

    /// The collector took the rows, but for `rejected` of them, and does not say which.
    void Taken(const MetrikSdk::Batch& batch, std::int64_t rejected, const std::string& message);

    /// The one row will not be sent any more.
    void Refused(const MetrikSdk::Batch& batch, long status, const std::string& reason);

    /// The one row was not taken; `isTry` while others were. Returns how many such tries it has behind it.
    int Failed(const MetrikSdk::Batch& batch, bool isTry, const std::string& reason);

    /// The same for each row that failed in this run, at its end. Rows with `most` tries behind them are
    /// refused.
    void EndRun(int most);

    /// Writes what is kept in mind.
    void Settle();

    /// What became of rows without a word of the collector since the last call: too large, or deleted.
    std::vector<RefusedRows> TakeLost() { return std::exchange(m_lost, {}); }

    /// Whether, since the last call, the store turned out to be another one, or its ids to have begun again.
    bool TakeRestart() { return std::exchange(m_hasRestarted, false); }

private:
    using Known = std::map<std::int64_t, HeldRow>; ///< By row.

    bool LookAtNew(std::size_t maxEvents);
    bool LookAtHeld();
    void NoteRestart();
    void LookAt(Row row);
    bool IsHeld(const Anchor& row) const;
    HeldRow& NoteFailure(const Anchor& row, const std::string& event, const std::string& reason);
    State::Change ChangeFor(const MetrikSdk::Batch& batch) const;
    void HoldWhatIsPassed(State::Change& change);
    void Lose(const Anchor& row, const std::string& event, const std::string& reason);
    void Commit(State::Change change);

    const StoreReader& m_reader;
    State& m_state;
    const MetrikSdk::BatchSettings m_settings;
    std::vector<Row> m_rows; ///< Looked at last.
    bool m_areNew = false;   ///< They are; else one that had stepped aside.
    std::int64_t m_from = Place::BEGINNING;
    MetrikSdk::EventKeys m_aside; ///< As the rules told last.
    Known m_held;                 ///< In the state, too.
    Known m_failed;               ///< Alone, in this run, and not taken or refused since.
    std::optional<State::Change> m_pending;
    std::vector<RefusedRows> m_lost;
    bool m_hasRestarted = false;
};

} // namespace reportctl::forward
