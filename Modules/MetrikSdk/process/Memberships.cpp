#include "Modules/MetrikSdk/process/Memberships.h"

#include <functional>
#include <tuple>
#include <utility>

#include "Modules/MetrikSdk/process/OutboxRegistry.h"

namespace MetrikSdk::process {
namespace {

int Compare(IMetrikSdk::Callback left, IMetrikSdk::Callback right) {
    return std::less<>()(left, right) ? -1 : static_cast<int>(std::less<>()(right, left));
}

} // namespace

bool Memberships::ByValue::operator()(const std::shared_ptr<const Membership>& left,
                                      const std::shared_ptr<const Membership>& right) const {
    if (const int order = Compare(left->onFailure, right->onFailure))
        return order < 0;
    if (const int order = Compare(left->onSuccess, right->onSuccess))
        return order < 0;
    return std::tie(left->engine, left->version, left->name) <
           std::tie(right->engine, right->version, right->name);
}

std::shared_ptr<const Membership> Memberships::Join(Membership wanted) {
    const std::lock_guard lock(m_mutex);
    auto membership = std::make_shared<Membership>(std::move(wanted));
    auto found = m_memberships.find(membership);
    if (found == m_memberships.end() && m_memberships.size() >= MAX_WITH_TEXTS) {
        membership->version.clear();
        membership->name.clear();
        found = m_memberships.find(membership);
    }
    if (found != m_memberships.end())
        return *found;
    auto& listeners = membership->engine->Listeners();
    listeners.Subscribe(membership->onFailure, membership->onSuccess);
    try {
        m_memberships.insert(membership);
    } catch (...) { // without the entry, no Leave would undo the Subscribe
        listeners.Unsubscribe(membership->onFailure, membership->onSuccess);
        throw;
    }
    return membership;
}

void Memberships::Leave(std::shared_ptr<const Membership>& membership) {
    const std::lock_guard lock(m_mutex);
    const auto found = m_memberships.find(membership);
    membership.reset();
    if (found == m_memberships.end() || found->use_count() > 1)
        return;
    auto engine = (*found)->engine;
    engine->Events().EndRuns();
    engine->Listeners().Unsubscribe((*found)->onFailure, (*found)->onSuccess);
    m_memberships.erase(found);
    m_registry.Release(engine);
}

} // namespace MetrikSdk::process
