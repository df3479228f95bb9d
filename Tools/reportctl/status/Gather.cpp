#include <algorithm>
#include <filesystem>

#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include "Common/Paths.h"
#include "SystemTool/CommonTool.h"
#include "SystemTool/Platform.h"
#include "Tools/reportctl/status/OutboxFailure.h"
#include "Tools/reportctl/status/Parts.h"
#include "Tools/reportctl/status/Status.h"
#include "Tools/reportctl/store/Paths.h"

namespace reportctl::status {
namespace {

namespace fs = std::filesystem;
namespace Paths = SyncServiceReport::Paths;

/// The space of the file system that has the directory, or the nearest parent that exists.
Disk LookAtDisk(fs::path directory) {
    std::error_code error;
    while (!fs::exists(directory, error) && directory.has_relative_path())
        directory = directory.parent_path();
    struct statvfs space {};
    if (::statvfs(directory.c_str(), &space) != 0)
        return {};
    return {std::uint64_t{space.f_bavail} * space.f_frsize, std::uint64_t{space.f_blocks} * space.f_frsize};
}

/// The user whose service is looked at: the owner of the data, because root may look at another user's
/// service.
uid_t OwnerOfData(const std::string& data) {
    struct stat status {};
    return ::stat(Paths::Suite(data).c_str(), &status) == 0 ? status.st_uid : ::geteuid();
}

/// The process that runs; when none does, the one that ran last.
LogWriter WriterOf(const Service& service, const ReportLedger::Look& ledger) {
    if (ledger.counting || (!service.isRunning && ledger.sight == ReportLedger::Sight::Sound))
        return {std::to_string(ledger.process), ledger.startedAtMs};
    return {service.process ? std::to_string(*service.process) : "", 0};
}

OutboxWorked WhatWorked(const Status& status) {
    constexpr auto TO_ANALYTICS = static_cast<unsigned>(ReportLedger::Outcome::ToAnalytics);
    return {status.outbox.lastDeliveredAtMs.value_or(0),
            static_cast<std::int64_t>(status.ledger.lastMs[TO_ANALYTICS])};
}

} // namespace

Status Gather() {
    const std::string data = SystemTool::CommonTool::GetUserDataDir();
    Status status;
    status.ledger = ReportLedger::LookAt(store::LedgerPath());
    status.atMs = SystemTool::Platform::CoarseTimeMs();
    status.lastMinute = ledger::OfTheLastMinute(status.ledger);
    status.lastSecond = ledger::OfTheLastSecond(status.ledger);
    status.service = LookAtService(status.ledger, OwnerOfData(data));
    status.store = LookAtStore(store::StorePath());
    const auto writer = WriterOf(status.service, status.ledger);
    status.log = LookAtLog(Paths::ServiceLogs(data), writer, status.atMs);
    status.outbox = LookAtOutbox(store::OutboxPath(), status.service);
    AddNotedFailure(status.log.fromOutbox, status.outbox, writer);
    status.outbox.lastFailure = LastingFailure(status.log.fromOutbox, WhatWorked(status), status.atMs);
    status.disk = LookAtDisk(data);
    return status;
}

} // namespace reportctl::status
