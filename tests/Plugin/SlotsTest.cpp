#include <cstdint>
#include <cstring>

#include <gtest/gtest.h>

#include "Plugin/ILogger.h"
#include "Plugin/IMetrikSdk.h"
#include "Plugin/ISqliteDatabase.h"

// The order of the operations is the plug-ins' binary interface: plug-ins that were built earlier rely on it.

namespace {

/// The place of a virtual operation in its class's table. A pointer to such an operation holds its offset in
/// bytes plus one.
template <typename Operation>
std::size_t SlotOf(Operation operation) {
    std::uintptr_t offset = 0;
    std::memcpy(&offset, &operation, sizeof offset);
    return (offset - 1) / sizeof(void*);
}

} // namespace

TEST(Slots, OfTheLogger) {
    EXPECT_EQ(SlotOf(&SystemTool::IO::ILogger::InitLog), 0U);
    EXPECT_EQ(SlotOf(&SystemTool::IO::ILogger::WriteLog), 1U);
}

TEST(Slots, OfTheDatabase) {
    EXPECT_EQ(SlotOf(&ISqliteDatabase::Open), 0U);
    EXPECT_EQ(SlotOf(&ISqliteDatabase::CreateTable), 1U);
    EXPECT_EQ(SlotOf(&ISqliteDatabase::ExecSql), 2U);
    EXPECT_EQ(SlotOf(&ISqliteDatabase::BatExecSql), 3U);
    EXPECT_EQ(SlotOf(&ISqliteDatabase::QuerySql), 4U);
    EXPECT_EQ(SlotOf(&ISqliteDatabase::GetTotalCount), 5U);
    EXPECT_EQ(SlotOf(&ISqliteDatabase::GetLastErrorMsg), 6U);
}

TEST(Slots, OfTheSdk) {
    EXPECT_EQ(SlotOf(&IMetrikSdk::GetSdkVersion), 0U);
    EXPECT_EQ(SlotOf(&IMetrikSdk::GetPendingCount), 1U);
    EXPECT_EQ(SlotOf(&IMetrikSdk::InitSdk), 2U);
    EXPECT_EQ(SlotOf(&IMetrikSdk::ReportEvent), 3U);
}
