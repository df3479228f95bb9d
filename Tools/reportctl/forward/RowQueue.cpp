#include "Tools/reportctl/forward/RowQueue.h"

#include <algorithm>

#include <fmt/format.h>

#include "SystemTool/Version.h"

namespace reportctl::forward {
namespace {

using MetrikSdk::Batch;
using MetrikSdk::EventKeys;
using MetrikSdk::StoredEvent;

/// The rows' resource: what a module is for an event.
MetrikSdk::ModuleIdentity Sender() {
    return {"store", SystemTool::Version::Number(), "SyncServiceReport"};
}

constexpr auto GONE = "the row was deleted, or is another one now, and could not be sent before";

RefusedRows One(const Anchor& row, const std::string& event, long status, const std::string& reason) {
    return {row.row, row.row, 1, row.uid, event, status, reason};
}

Anchor AnchorOf(const StoredEvent& event) {
    return {event.row, event.uuid};
}

bool Has(const EventKeys& keys, const Anchor& row) {
    const auto found = keys.find(row.row);
    return found != keys.end() && found->second == row.uid;
}

} // namespace

RowQueue::RowQueue(const StoreReader& reader, State& state, const MetrikSdk::BatchSettings& settings)
    : m_reader(reader), m_state(state), m_settings(settings) {
    for (auto& held : m_state.Held())
        m_held[held.row.row] = std::move(held);
}

MetrikSdk::upload::QueueHead RowQueue::TakeOldest(std::size_t maxEvents, const EventKeys& without) {
    m_aside = without;
    if (!LookAtNew(maxEvents) && !LookAtHeld())
        return {};
    std::size_t fitting = 0;
    std::size_t bytes = 0;
    for (const auto& row : m_rows) {
        bytes += BytesOf(row);
        if (fitting > 0 && bytes > m_settings.maxBytes)
            break;
        ++fitting;
    }
    // Rows wait for no company: they were looked for once in a while, and these are all that there are.
    return {m_rows.size(), fitting, MetrikSdk::WallTime()};
}

bool RowQueue::LookAtNew(std::size_t maxEvents) {
    for (;;) {
        auto page = m_reader.Read(m_state.Where(), m_aside, maxEvents, m_settings.maxBytes);
        if (page.from < m_state.Where().position)
            NoteRestart();
        m_from = page.from;
        m_rows = std::move(page.rows);
        m_areNew = true;
        if (!m_rows.empty() || !page.tooLarge)
            return !m_rows.empty();
        State::Change change{
            .from = m_from, .position = *page.tooLarge, .sent = {}, .held = {}, .refused = {}};
        change.refused.push_back(One({*page.tooLarge, ""}, "", 0, "the row is too large to be sent"));
        m_lost.push_back(change.refused.back());
        HoldWhatIsPassed(change);
        Commit(std::move(change));
    }
}

/// Held rows of the store before are gone. Others may have their ids.
void RowQueue::NoteRestart() {
    m_hasRestarted = true;
    for (const auto& [row, held] : Known(m_held))
        if (!m_reader.ReadOne(m_state.Where(), held.row))
            Lose(held.row, held.event, GONE);
}

bool RowQueue::LookAtHeld() {
    while (true) {
        const auto next = std::find_if(m_held.begin(), m_held.end(),
                                       [&](const auto& held) { return !Has(m_aside, held.second.row); });
        if (next == m_held.end())
            return false;
        const auto held = next->second;
        if (auto row = m_reader.ReadOne(m_state.Where(), held.row)) {
            LookAt(std::move(*row));
            return true;
        }
        Lose(held.row, held.event, GONE);
    }
}

void RowQueue::LookAt(Row row) {
    m_rows.clear();
    m_rows.push_back(std::move(row));
    m_areNew = false;
}

bool RowQueue::TakeOne(const MetrikSdk::EventKey& key) {
    const Anchor wanted{key.row, key.uuid};
    if (auto row = m_reader.ReadOne(m_state.Where(), wanted)) {
        LookAt(std::move(*row));
        return true;
    }
    const auto known = m_failed.find(key.row);
    Lose(wanted, known == m_failed.end() ? "" : known->second.event, GONE);
    return false;
}

bool RowQueue::HasOthersThan(const EventKeys& these) {
    if (!m_areNew) // what is held lets others past already
        return true;
    const bool areHeld = std::any_of(m_held.begin(), m_held.end(),
                                     [&](const auto& held) { return !Has(these, held.second.row); });
    return areHeld || !m_reader.Read(m_state.Where(), these, 1, 1).rows.empty();
}

Batch RowQueue::TakeBatch(std::size_t count, MetrikSdk::WallTime now) {
    const auto& installation = m_state.Where().installation;
    Batch batch{.outboxId = installation, .events = {}, .releases = {{1, Sender()}}};
    for (std::size_t i = 0; i < std::min(count, m_rows.size()); ++i)
        batch.events.push_back(EventOf(installation, m_rows[i], now));
    m_rows.clear();
    return batch;
}

State::Change RowQueue::ChangeFor(const Batch& batch) const {
    State::Change change{
        .from = m_from, .position = batch.events.back().row, .sent = {}, .held = {}, .refused = {}};
    if (!m_areNew)
        change.from = change.position = m_state.Where().position;
    return change;
}

void RowQueue::Taken(const Batch& batch, std::int64_t rejected, const std::string& message) {
    auto change = ChangeFor(batch);
    const auto& events = batch.events;
    const auto count = static_cast<std::int64_t>(events.size());
    change.forwarded = count - rejected;
    std::transform(events.begin(), events.end(), std::back_inserter(change.sent), AnchorOf);
    if (rejected > 0)
        change.refused.push_back({events.front().row, events.back().row, rejected,
                                  count == 1 ? events.front().uuid : "",
                                  count == 1 ? events.front().eventId : "", 200,
                                  fmt::format("the collector rejected {} of the {} rows of a request: {}",
                                              rejected, count, message)});
    HoldWhatIsPassed(change);
    for (const auto& event : events) {
        m_held.erase(event.row);
        m_failed.erase(event.row);
    }
    Commit(std::move(change));
}

void RowQueue::Refused(const Batch& batch, long status, const std::string& reason) {
    const auto& event = batch.events.front();
    auto change = ChangeFor(batch);
    change.refused.push_back(One(AnchorOf(event), event.eventId, status, reason));
    HoldWhatIsPassed(change);
    m_held.erase(event.row);
    m_failed.erase(event.row);
    Commit(std::move(change));
}

int RowQueue::Failed(const Batch& batch, bool isTry, const std::string& reason) {
    const auto& event = batch.events.front();
    auto& failed = NoteFailure(AnchorOf(event), event.eventId, reason);
    failed.tries += isTry ? 1 : 0;
    if (const auto held = m_held.find(event.row); isTry && held != m_held.end()) {
        held->second = failed;
        m_failed.erase(event.row); // it is counted
        const auto position = m_state.Where().position;
        Commit({.from = position, .position = position, .sent = {}, .held = {held->second}, .refused = {}});
        return held->second.tries;
    }
    return failed.tries;
}

HeldRow& RowQueue::NoteFailure(const Anchor& row, const std::string& event, const std::string& reason) {
    auto& failed = m_failed[row.row];
    if (failed.row.uid != row.uid) {
        failed = {row, event, 0, reason};
        if (const auto held = m_held.find(row.row); held != m_held.end() && held->second.row.uid == row.uid)
            failed.tries = held->second.tries;
    }
    failed.reason = reason;
    return failed;
}

/// Rows that stepped aside and that the position is about to pass.
void RowQueue::HoldWhatIsPassed(State::Change& change) {
    for (const auto& [row, uid] : m_aside) {
        if (row > change.position || IsHeld({row, uid}))
            continue;
        const auto failed = m_failed.find(row);
        const HeldRow held = failed != m_failed.end() && failed->second.row.uid == uid
                                 ? failed->second
                                 : HeldRow{{row, uid}, "", 0, ""};
        change.held.push_back(held);
        m_held[row] = held;
    }
}

bool RowQueue::IsHeld(const Anchor& row) const {
    const auto held = m_held.find(row.row);
    return held != m_held.end() && held->second.row.uid == row.uid;
}

void RowQueue::Lose(const Anchor& row, const std::string& event, const std::string& reason) {
    const auto position = m_state.Where().position;
    State::Change change{.from = position, .position = position, .sent = {}, .held = {}, .refused = {}};
    change.refused.push_back(One(row, event, 0, reason));
    m_lost.push_back(change.refused.back());
    m_held.erase(row.row);
    m_failed.erase(row.row);
    Commit(std::move(change));
}

void RowQueue::EndRun(int most) {
    const auto position = m_state.Where().position;
    State::Change change{.from = position, .position = position, .sent = {}, .held = {}, .refused = {}};
    for (const auto& [row, failed] : std::exchange(m_failed, {})) {
        if (!IsHeld(failed.row))
            continue;
        auto held = failed;
        ++held.tries;
        if (held.tries < most) {
            change.held.push_back(held);
            continue;
        }
        change.refused.push_back(
            One(held.row, held.event, 0,
                fmt::format("not taken at {} tries, while others were: {}", held.tries, held.reason)));
        m_lost.push_back(change.refused.back());
        m_held.erase(row);
    }
    Commit(std::move(change));
}

/// One change at a time is kept in mind: nothing else is done before it is written.
void RowQueue::Commit(State::Change change) {
    Settle();
    m_pending = std::move(change);
    Settle();
}

void RowQueue::Settle() {
    if (!m_pending)
        return;
    m_state.Commit(*m_pending);
    m_pending.reset();
}

} // namespace reportctl::forward
