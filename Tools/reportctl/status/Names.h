#pragma once

#include <array>

#include "Ledger/Counts.h"

namespace reportctl::status {

/// A counter of the ledger, with its names in JSON and in metrics.
struct Name {
    unsigned place;
    const char* json;
    const char* metric; ///< The part between "hublink_report_" and "_total".
    const char* help;
};

inline constexpr unsigned Place(ReportLedger::Outcome outcome) {
    return static_cast<unsigned>(outcome);
}

/// The counters that have a name, except those of the refused reports.
inline constexpr std::array COUNTERS{
    Name{ReportLedger::RECEIVED, "received", "received", "Datagrams that the service took from its socket."},
    Name{ReportLedger::RECEIVED_BYTES, "receivedBytes", "received_bytes", "Bytes of these datagrams."},
    Name{ReportLedger::EMPTY, "empty", "empty", "Datagrams of 0 bytes, which are ignored."},
    Name{ReportLedger::AT_SIZE_LIMIT, "atSizeLimit", "at_size_limit",
         "Datagrams of at least 10240 bytes, of which what is longer was cut."},
    Name{ReportLedger::UNFORMATTABLE, "unformattable", "unformattable",
         "Texts that are no format for the log; they are handled like all others."},
    Name{ReportLedger::DROPPED_BY_KERNEL, "droppedByKernel", "dropped_by_kernel",
         "Datagrams that the kernel dropped because the socket's buffer was full."},
    Name{Place(ReportLedger::Outcome::Stored), "stored", "stored", "Reports that the store took."},
    Name{Place(ReportLedger::Outcome::ToAnalytics), "toAnalytics", "to_analytics",
         "Events that the SDK took."},
    Name{Place(ReportLedger::Outcome::Control), "control", "control", "Control messages of a known kind."},
    Name{Place(ReportLedger::Outcome::OtherControl), "otherControl", "other_control",
         "Control messages of a kind that is ignored."},
    Name{ReportLedger::LOST_AT_ENDS, "lostAtEnds", "lost_at_ends",
         "Reports that were received and not handled when the service ended."},
};

/// The counters of the refused reports, one for each reason.
inline constexpr std::array REASONS{
    Name{Place(ReportLedger::Outcome::NotJson), "notJson", nullptr, nullptr},
    Name{Place(ReportLedger::Outcome::Store), "store", nullptr, nullptr},
    Name{Place(ReportLedger::Outcome::NoStore), "noStore", nullptr, nullptr},
    Name{Place(ReportLedger::Outcome::ModuleNotInit), "moduleNotInit", nullptr, nullptr},
    Name{Place(ReportLedger::Outcome::EventIdWithoutBar), "eventIdWithoutBar", nullptr, nullptr},
    Name{Place(ReportLedger::Outcome::ValueNotJson), "valueNotJson", nullptr, nullptr},
    Name{Place(ReportLedger::Outcome::Analytics), "analytics", nullptr, nullptr},
    Name{Place(ReportLedger::Outcome::Exception), "exception", nullptr, nullptr},
};

} // namespace reportctl::status
