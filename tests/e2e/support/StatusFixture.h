#pragma once

#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "SystemTool/IO/JsonDocument.h"
#include "tests/e2e/support/Service.h"

/// The real service, and what `reportctl status` says about it.
class StatusFixture : public ::testing::Test {
protected:
    StatusFixture() { m_service.Install(); }

    /// Runs reportctl. Returns what it printed, and sets `code` to its exit code.
    std::string Run(const std::vector<std::string>& arguments, int& code) const {
        const auto before = m_service.Output().size();
        code = m_service.Reportctl(arguments);
        return m_service.Output().substr(before);
    }

    SystemTool::IO::JsonDocument Json(int expectedCode) const {
        int code = -1;
        std::string error;
        SystemTool::IO::JsonDocument json;
        m_text = Run({"status", "--json"}, code);
        json.FromJson(m_text, error);
        EXPECT_EQ(error, "") << m_text;
        EXPECT_EQ(code, expectedCode) << m_text;
        EXPECT_EQ(json.GetKeyValue("verdict").ToString(), expectedCode == 0   ? "healthy"
                                                          : expectedCode == 1 ? "degraded"
                                                                              : "down");
        return json;
    }

    /// The value at a path such as "ledger.total.received", as text.
    static std::string At(SystemTool::IO::JsonDocument json, std::string path) {
        for (std::size_t dot = 0; (dot = path.find('.')) != std::string::npos; path.erase(0, dot + 1))
            json = json.GetKeyValue(path.substr(0, dot));
        return json.GetKeyValue(path).ToJson();
    }

    /// Expects this exit code, and a reason with these words.
    void Expect(int code, const std::string& words) const {
        Json(code);
        EXPECT_THAT(m_text, ::testing::HasSubstr(words));
    }

    Service m_service;
    mutable std::string m_text; ///< The output of the last call.
};
