#include "SystemTool/IO/JsonDocument.h"

#include <gtest/gtest.h>

using SystemTool::IO::JsonDocument;

TEST(JsonDocument, ReadsAMember) {
    std::string error;
    EXPECT_EQ(JsonDocument().FromJson(R"({"a":1.5})", error).GetKeyValue("a").ToString(), "1.5");
    EXPECT_EQ(error, "");
}
