#pragma once

#include <cstdlib>
#include <filesystem>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "Modules/MetrikSdk/outbox/OutboxStore.h"
#include "Plugin/IMetrikSdk.h"
#include "Plugin/ModuleLoader.h"
#include "SystemTool/IO/Directory.h"
#include "tests/Modules/MetrikSdk/support/LoopbackServer.h"
#include "tests/Modules/MetrikSdk/support/ReceivedEvents.h"
#include "tests/Modules/MetrikSdk/support/Told.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/WaitUntil.h"

/// The real plug-in, loaded as the service loads it, with its own database directory.
class PluginFixture : public testing::Test {
protected:
    using Loader = SystemTool::ModuleLoader<IMetrikSdk>;

    PluginFixture() {
        Told::Forget();
        SetVariable("XDG_DATA_HOME", m_directory.Path()); // the plug-in may make missing directories below it
        SetVariable("METRIK_START_SPREAD", "0");          // the first request at once
    }

    /// After every test, the counters must agree with the tables.
    void TearDown() override {
        Stop();
        if (std::filesystem::is_regular_file(File()))
            ExpectTheCountersToBeTrue();
    }

    ~PluginFixture() override {
        for (const auto& name : m_variables)
            ::unsetenv(name.c_str());
    }

    /// Sets OTEL_EXPORTER_OTLP_<name>. To be called before Start, because the environment is read when an
    /// outbox is opened.
    void Configure(const std::string& name, const std::string& value) {
        SetVariable("OTEL_EXPORTER_OTLP_" + name, value);
    }

    void SetVariable(const std::string& name, const std::string& value) {
        m_variables.push_back(name);
        ::setenv(name.c_str(), value.c_str(), 1);
    }

    static std::unique_ptr<Loader> Load() {
        return std::make_unique<Loader>(SystemTool::IO::Directory::GetExcutableDirectory() +
                                        "libMetrikSdk.dylib");
    }

    void Start() {
        m_loader = Load();
        ASSERT_NE(m_loader->GetModule(), nullptr) << m_loader->GetLastError();
        ASSERT_TRUE(m_loader->GetModule()->InitSdk("A759", "1", "default", "", m_directory.Path(),
                                                   &Told::OnFailure, &Told::OnSuccess));
    }

    void Report(int count) {
        for (int i = 0; i < count; ++i)
            ASSERT_TRUE(m_loader->GetModule()->ReportEvent("A759|10001", NumberedPayload(m_next++)));
    }

    void Stop() { m_loader.reset(); }

    std::string File() const { return m_directory.Path() + "/MetrikOutbox.db"; }

    MetrikSdk::outbox::OutboxStatus Totals() const {
        return MetrikSdk::outbox::OutboxStore(File(), std::chrono::seconds(5)).Status();
    }

    /// Reads all counters in one statement, because an uploader that hangs may still change them.
    void ExpectTheCountersToBeTrue() const {
        SQLite::Database outbox(File(), SQLite::OPEN_READWRITE);
        outbox.setBusyTimeout(5000);
        SQLite::Statement query(outbox,
                                "SELECT waiting, (SELECT count(*) FROM event), "
                                "waiting_bytes, (SELECT coalesce(sum(bytes), 0) FROM event), "
                                "dead_letters, (SELECT count(*) FROM dead_letter), "
                                "dead_letter_bytes, (SELECT coalesce(sum(bytes), 0) FROM dead_letter) "
                                "FROM outbox_status");
        ASSERT_TRUE(query.executeStep());
        for (int column = 0; column < 8; column += 2)
            EXPECT_EQ(query.getColumn(column).getInt64(), query.getColumn(column + 1).getInt64())
                << query.getColumn(column).getName();
    }

    bool WaitUntilNothingWaits() const {
        return WaitUntil([this] { return Totals().waiting == 0; }, std::chrono::seconds(60));
    }

    TemporaryDirectory m_directory;
    std::unique_ptr<Loader> m_loader;
    int m_next = 0;

private:
    std::vector<std::string> m_variables;
};
