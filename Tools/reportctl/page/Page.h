#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "Tools/reportctl/store/Tally.h"

/// The page of `reportctl page`: one HTML file that holds everything it needs and asks no other place for
/// anything.
namespace reportctl::page {

/// How many reports were refused by each reason in the time before `atMs`.
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
    std::int64_t rowsBefore = 0; ///< rows of the store that no quarter-hour counts
    std::vector<store::Count> events;
    std::vector<store::Count> modules;
    std::vector<RefusedAt> refused;
};

/// The page. `nonce` is what its style and scripts are known by: a random text of letters and digits, another
/// one for each page. Every text of the data stays a text and never becomes markup.
std::string ComposePage(const PageData& data, const std::string& nonce);

/// Such a text, from the system's random numbers.
std::string RandomNonce();

} // namespace reportctl::page
