#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "Tools/reportctl/status/Status.h"

/// What status shows, as figures for monitoring systems. Every format is written from the one list.
namespace reportctl::status {

struct Figure {
    struct Sample {
        std::string reason; ///< Of a refusal; else empty.
        std::variant<std::int64_t, double> value;
    };

    /// Its rooms with dots between, such as "outbox.waiting".
    std::string name;
    std::string help;
    std::string unit; ///< By UCUM; a count of things is in braces.
    bool isCounter = false;
    /// When a counter began to count, in milliseconds since 1970; nothing when that is not known.
    std::optional<std::int64_t> countsSinceMs;
    std::vector<Sample> samples;
};

/// One whose value is not known is left out.
std::vector<Figure> FiguresOf(const Status& status, const Judgement& judgement);

} // namespace reportctl::status
