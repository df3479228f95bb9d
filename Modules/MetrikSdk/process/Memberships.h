#pragma once

#include <cstddef>
#include <memory>
#include <mutex>
#include <set>
#include <string>

#include "Modules/MetrikSdk/process/OutboxEngine.h"
#include "Plugin/IMetrikSdk.h"

namespace MetrikSdk::process {

class OutboxRegistry;

/// What a module has in common with most other modules of its process. It is kept once for all of them,
/// because a module is cheap to announce: any program of the machine may announce a hundred thousand.
struct Membership {
    std::shared_ptr<OutboxEngine> engine; ///< Not null.
    IMetrikSdk::Callback onFailure = nullptr;
    IMetrikSdk::Callback onSuccess = nullptr;
    std::string version;
    std::string name;
};

/// The memberships of a process. Threads: any.
class Memberships {
public:
    /// How many memberships may have a version and a name. The modules of a suite share a few memberships.
    /// When there are more than this, both texts are left out, because they come from an unknown program and
    /// would stay in memory.
    static constexpr std::size_t MAX_WITH_TEXTS = 1000;

    explicit Memberships(OutboxRegistry& registry) : m_registry(registry) {}

    /// Returns the membership that equals `wanted`, and makes it when there is none. Its callbacks get the
    /// engine's messages until the last module with this membership has called Leave.
    std::shared_ptr<const Membership> Join(Membership wanted);

    /// Gives `membership` up. When no other module has it, the engine is given back to the registry.
    void Leave(std::shared_ptr<const Membership>& membership);

private:
    struct ByValue {
        bool operator()(const std::shared_ptr<const Membership>& left,
                        const std::shared_ptr<const Membership>& right) const;
    };

    OutboxRegistry& m_registry;
    std::mutex m_mutex; ///< Guards all below.
    std::set<std::shared_ptr<const Membership>, ByValue> m_memberships;
};

} // namespace MetrikSdk::process
