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

/// What a module has in common with most others of its process. It is kept once for all of them: a module is
/// cheap to announce, and any program of the machine may announce a hundred thousand.
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
    /// So many at once have a version and a name. The modules of a suite share a few; beyond, both texts are
    /// left out, for they are a stranger's, and would stay in memory.
    static constexpr std::size_t MAX_WITH_TEXTS = 1000;

    explicit Memberships(OutboxRegistry& registry) : m_registry(registry) {}

    /// The membership like `wanted`. Its callbacks are told what the engine has to tell, until the last
    /// module left it.
    std::shared_ptr<const Membership> Join(Membership wanted);

    /// Gives `membership` up. The last module's call gives the engine back to the registry.
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
