#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "Tools/reportctl/store/Tally.h"

/// The page of `reportctl page`: one HTML file that contains everything it needs and loads nothing from
/// elsewhere.
namespace reportctl::page {

/// How many reports were refused for each reason between the mark before and `atMs`.
struct RefusedAt {
    std::int64_t atMs = 0;
    std::vector<std::pair<std::string, std::uint64_t>>
        byReason; ///< by the reasons' names in `reportctl status --json`
};

/// What the page shows. Times are milliseconds since 1970.
struct PageData {
    std::int64_t generatedAtMs = 0;
    int reloadSeconds = 0;  ///< 0: the page does not reload itself
    std::string statusJson; ///< what `reportctl status --json` prints
    store::QuarterHours quarterHours;
    std::int64_t rowsBefore = 0; ///< rows of the store that are in no quarter-hour
    std::vector<store::Count> events;
    std::vector<store::Count> modules;
    std::vector<RefusedAt> refused;
};

/// Composes the page. `nonce` is a random text of letters and digits, a new one for each page: the browser
/// accepts only the style and scripts that carry it. Every text of the data stays a text and never becomes
/// markup.
std::string ComposePage(const PageData& data, const std::string& nonce);

/// A new nonce, from the system's random numbers.
std::string RandomNonce();

} // namespace reportctl::page
