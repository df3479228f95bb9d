#include "Modules/MetrikSdk/report/Notifier.h"

#include <stdexcept>
#include <string>
#include <vector>

#include <gtest/gtest.h>

using MetrikSdk::report::Cause;
using MetrikSdk::report::Notifier;
using namespace std::chrono_literals;

namespace {

std::vector<std::string> g_told;

void Listen(std::string what, std::string why) {
    g_told.push_back(what + "-" + why);
}

void Throw(std::string, std::string) {
    throw std::runtime_error("a bad listener");
}

class TheNotifier : public testing::Test {
protected:
    TheNotifier() { g_told.clear(); }
    Notifier m_notifier{1min};
};

TEST_F(TheNotifier, CallsAFunctionOnceHoweverManyModulesBroughtIt) {
    for (int i = 0; i < 10'000; ++i)
        m_notifier.Subscribe(&Listen, nullptr);
    m_notifier.TellFailure({Cause::Upload, "no route"});
    EXPECT_EQ(g_told, std::vector<std::string>{"upload-no route"});
}

TEST_F(TheNotifier, CallsAFunctionUntilItsLastModuleIsGone) {
    m_notifier.Subscribe(&Listen, &Listen);
    m_notifier.Subscribe(&Listen, &Listen);
    m_notifier.Unsubscribe(&Listen, &Listen);
    m_notifier.TellSuccess("upload", "1");
    m_notifier.Unsubscribe(&Listen, &Listen);
    m_notifier.TellSuccess("upload", "2");
    m_notifier.TellFailure({Cause::Upload, "3"});
    EXPECT_EQ(g_told, std::vector<std::string>{"upload-1"});
}

TEST_F(TheNotifier, SurvivesAListenerThatThrows) {
    m_notifier.Subscribe(&Throw, nullptr);
    m_notifier.Subscribe(&Listen, nullptr);
    m_notifier.TellFailure({Cause::File, "disk full"});
    EXPECT_EQ(g_told.size(), 1U);
}

TEST_F(TheNotifier, IgnoresMissingFunctions) {
    m_notifier.Subscribe(nullptr, nullptr);
    m_notifier.TellFailure({Cause::File, "disk full"});
    m_notifier.TellSuccess("upload", "1");
    m_notifier.Unsubscribe(nullptr, nullptr);
    EXPECT_TRUE(g_told.empty());
}

} // namespace
