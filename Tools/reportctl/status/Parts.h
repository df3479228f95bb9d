#pragma once

#include <string>

#include "Tools/reportctl/status/OutboxFailure.h"
#include "Tools/reportctl/status/Status.h"

/// The parts of the status; each function gathers one part. Nothing throws when something is missing, is
/// damaged or belongs to another user: it is then not known. No file is changed.
namespace reportctl::status {

/// The service of the user `owner`. `ledger` is that user's ledger.
Service LookAtService(const ReportLedger::Look& ledger, uid_t owner);

/// Whether there is a file at the path. When there is something else, or when it cannot be known, `problem`
/// gets the reason.
bool IsFile(const std::string& path, std::string& problem);

Store LookAtStore(const std::string& path);

/// `service` gives the process whose settings name the collector.
Outbox LookAtOutbox(const std::string& path, const Service& service);

/// `writer` is the process whose lines about its outbox count.
Log LookAtLog(const std::string& directory, const LogWriter& writer, std::int64_t nowMs);

} // namespace reportctl::status
