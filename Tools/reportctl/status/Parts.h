#pragma once

#include <string>

#include "Tools/reportctl/status/Status.h"

/// Each part of the status, gathered by itself. Nothing throws for what is missing, damaged or another
/// user's: it is then not known. No file is changed.
namespace reportctl::status {

/// The service of the user `owner`, whose ledger was looked at.
Service LookAtService(const ReportLedger::Look& ledger, uid_t owner);

/// Whether there is a file; `problem` says why not, unless there is nothing at all.
bool IsFile(const std::string& path, std::string& problem);

Store LookAtStore(const std::string& path);

/// `service` has the settings, `log` what went wrong last.
Outbox LookAtOutbox(const std::string& path, const Service& service, const Log& log);

Log LookAtLog(const std::string& directory, std::int64_t nowMs);

} // namespace reportctl::status
