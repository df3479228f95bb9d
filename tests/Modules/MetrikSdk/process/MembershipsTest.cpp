#include "Modules/MetrikSdk/process/Memberships.h"

#include <gtest/gtest.h>

#include "Modules/MetrikSdk/process/OutboxRegistry.h"
#include "tests/Modules/MetrikSdk/support/Told.h"
#include "tests/support/TemporaryDirectory.h"

using namespace MetrikSdk;
using namespace MetrikSdk::process;

namespace {

class TheMemberships : public ::testing::Test {
protected:
    Membership Module(const std::string& version) {
        return {m_registry.Acquire(m_directory.Path()), &Told::OnFailure, nullptr, version, "name"};
    }

    TemporaryDirectory m_directory;
    OutboxRegistry m_registry{OutboxSettings{}, [](const char*) -> const char* { return nullptr; },
                              [this] { return m_directory.Path(); }};
};

} // namespace

TEST_F(TheMemberships, AreOneForModulesThatHaveAllInCommon) {
    auto& members = m_registry.Members();
    auto one = members.Join(Module("1"));
    auto same = members.Join(Module("1"));
    auto other = members.Join(Module("2"));
    EXPECT_EQ(one, same);
    EXPECT_NE(one, other);
    for (auto* membership : {&one, &same, &other})
        members.Leave(*membership);
}

TEST_F(TheMemberships, TellTheirCallbacksUntilTheLastModuleLeft) {
    Told::Forget();
    auto& members = m_registry.Members();
    const auto engine = m_registry.Acquire(m_directory.Path());
    auto one = members.Join(Module("1"));
    auto same = members.Join(Module("1"));
    members.Leave(one);
    engine->Listeners().TellFailure({report::Cause::File, "first"});
    members.Leave(same);
    engine->Listeners().TellFailure({report::Cause::Event, "second"});
    EXPECT_EQ(Told::Failures().All(), std::vector<std::string>{"outbox file: first"});
}

TEST_F(TheMemberships, LeaveTheTextsOutOnceTooManyModulesBringTheirOwn) {
    auto& members = m_registry.Members();
    std::vector<std::shared_ptr<const Membership>> joined;
    for (std::size_t i = 0; i < Memberships::MAX_WITH_TEXTS; ++i)
        joined.push_back(members.Join(Module(std::to_string(i))));
    EXPECT_EQ(joined.back()->version, std::to_string(Memberships::MAX_WITH_TEXTS - 1));
    joined.push_back(members.Join(Module("one more")));
    joined.push_back(members.Join(Module("another")));
    EXPECT_EQ(joined.back()->version, "");
    EXPECT_EQ(joined.back()->name, "");
    EXPECT_EQ(joined.back(), joined[joined.size() - 2]);
    EXPECT_EQ(members.Join(Module("0")), joined.front()) << "which was there before";
    for (auto& membership : joined)
        members.Leave(membership);
}
