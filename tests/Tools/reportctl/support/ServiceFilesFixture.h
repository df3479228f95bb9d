#pragma once

#include <array>
#include <filesystem>
#include <fstream>
#include <string>

#include "Ledger/Writer.h"
#include "tests/Tools/reportctl/support/OutboxFile.h"
#include "tests/Tools/reportctl/support/RowsFixture.h"

/// All files of a service: store, outbox, log and ledger. They hold texts that would control a terminal, that
/// would break out of their field, or that are not UTF-8.
class ServiceFilesFixture : public RowsFixture {
protected:
    void SetUp() override {
        RowsFixture::SetUp();
        InsertMany(20);
        Insert("'B100|' || char(27) || '[2J'", "'<b>\"a\", ' || char(10, 155) || cast(x'fffe' as text)",
               "'1700000000000'");
        MakeOutbox(Outbox());
        WriteLog();
        ReportLedger::Writer ledger;
        ASSERT_TRUE(ledger.Open(Data() + "/hublink/run", "1.2.3", "c0ffee", 1'700'000'000'000));
        ledger.Received(100, false, 1'700'000'000'000);
    }

    std::string Outbox() const { return Database() + "/MetrikOutbox.db"; }
    std::string Log() const { return Data() + "/hublink/log/metrik/Report.log"; }
    std::string Ledger() const { return Data() + "/hublink/run/Report.ledger"; }
    std::array<std::string, 4> Files() const { return {Store(), Outbox(), Log(), Ledger()}; }

    /// Removes the files that SQLite keeps beside the databases: they would repair the damage that a test
    /// does.
    void RemoveSideFiles() const {
        for (const auto& database : {Store(), Outbox()})
            for (const auto* suffix : {"-wal", "-shm"})
                std::filesystem::remove(database + suffix);
    }

private:
    void WriteLog() const {
        const std::string recv = "2023-11-14 22:13:20.123 INFO  [1:2] [App/ReportServer:42 Recv] ";
        std::ofstream(Log()) << recv << R"({"eventID":"B100|1","value":"value 1","createTime":1700000001})"
                             << "\n"
                             << recv << R"({"eventID":"B100|\\u001b]0;x","value":"<b>a \\x9b\xff"})"
                             << "\n"
                             << recv << "\x1b[2J raw\n"
                             << "2023-11-14 22:13:20.124 ERROR [1:2] [App/ReportServer:1 JsonTo";
    }
};
