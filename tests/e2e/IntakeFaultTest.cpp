#include <csignal>

#include <gtest/gtest.h>

#include "tests/e2e/support/Ledger.h"
#include "tests/support/WaitUntil.h"

// Datagrams that arrive while the service cannot receive wait in the kernel, as long as there is room.

TEST(IntakeFault, AStoppedServiceLosesWhatDoesNotFitTheSocketAndStoresTheRest) {
    Service service;
    service.Install();
    service.Start();
    service.Signal(SIGSTOP);
    const std::string filling(8000, 'x');
    int sent = 0;
    for (; Service::DroppedByKernel() == 0; ++sent) {
        ASSERT_LT(sent, 100'000) << "the socket never became full";
        Service::Send(R"({"eventID":"B1|)" + std::to_string(sent) + R"(","value":")" + filling + "\"}");
    }
    service.Signal(SIGCONT);
    EXPECT_TRUE(WaitUntil([&] { return service.RowCount() == sent - Service::DroppedByKernel(); }));
    EXPECT_TRUE(service.AwaitLines("App/ReportServer:42 Recv", static_cast<std::size_t>(service.RowCount())));
    const int rows = static_cast<int>(service.RowCount());
    EXPECT_EQ(
        service.Count(service.DatabaseFile(), "select max(cast(substr(eventID, 4) as integer)) from OperLog"),
        rows - 1)
        << "the last ones are lost, and no others";
    const auto dropped = Service::DroppedByKernel();
    for (int i = 0; i < 100; ++i)
        Service::Send(R"({"eventID":"B2|1"})");
    EXPECT_TRUE(WaitUntil([&] { return service.RowCount() == rows + 100; }));
    EXPECT_EQ(Service::DroppedByKernel(), dropped);
    EXPECT_TRUE(WaitUntil([&] {
        return service.Counted(ReportLedger::DROPPED_BY_KERNEL) == static_cast<std::uint64_t>(dropped);
    })) << "the ledger has them too";
    service.Kill();
    service.Start();
    EXPECT_EQ(service.Counted(ReportLedger::DROPPED_BY_KERNEL), static_cast<std::uint64_t>(dropped))
        << "the next socket counts from 0";
}
