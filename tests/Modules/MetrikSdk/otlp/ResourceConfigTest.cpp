#include "Modules/MetrikSdk/otlp/ResourceConfig.h"

#include <map>

#include <gtest/gtest.h>

#include "SystemTool/CommonTool.h"

using namespace MetrikSdk;

namespace {

class TheResourceConfig : public testing::Test {
protected:
    otlp::ResourceConfig Read(const std::map<std::string, std::string>& environment) {
        m_complaints.clear();
        return otlp::ReadResource(
            [&](const char* name) -> const char* {
                const auto found = environment.find(name);
                return found == environment.end() ? nullptr : found->second.c_str();
            },
            m_complaints);
    }

    std::vector<std::string> m_complaints;
};

TEST_F(TheResourceConfig, SaysWhichSystemThisIsAndNotWhichMachine) {
    const auto config = Read({});
    EXPECT_EQ(config.serviceName, "");
    EXPECT_EQ(config.osDescription, SystemTool::CommonTool::GetOSVersionString());
    EXPECT_FALSE(config.osType.empty());
    EXPECT_TRUE(config.attributes.empty());
}

TEST_F(TheResourceConfig, AddsWhatTheEnvironmentLists) {
    const auto config = Read({{"OTEL_RESOURCE_ATTRIBUTES", "host.name=desk%207 , team=a%2Cb,team=c,,x="}});
    const std::vector<std::pair<std::string, std::string>> expected{
        {"host.name", "desk 7"}, {"team", "a,b"}, {"x", ""}};
    EXPECT_EQ(config.attributes, expected);
    EXPECT_TRUE(m_complaints.empty());
}

TEST_F(TheResourceConfig, PrefersTheServiceNamesOwnVariable) {
    const auto* list = "service.name=listed,team=a";
    EXPECT_EQ(Read({{"OTEL_RESOURCE_ATTRIBUTES", list}}).serviceName, "listed");
    EXPECT_EQ(Read({{"OTEL_RESOURCE_ATTRIBUTES", list}, {"OTEL_SERVICE_NAME", "own"}}).serviceName, "own");
    EXPECT_EQ(Read({{"OTEL_RESOURCE_ATTRIBUTES", list}}).attributes.size(), 1U);
}

TEST_F(TheResourceConfig, DropsAnIllFormedListAsAWhole) {
    for (const auto* bad : {"a=1,nonsense", "=1", "a=1,=2", "a=1,b=%zz", "a=1,b%4=2", "a=%"}) {
        EXPECT_TRUE(Read({{"OTEL_RESOURCE_ATTRIBUTES", bad}}).attributes.empty()) << bad;
        EXPECT_EQ(m_complaints, std::vector<std::string>{
                                    "OTEL_RESOURCE_ATTRIBUTES is no list of key=value and counts as unset"});
    }
}

} // namespace
