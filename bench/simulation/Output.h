#pragma once

#include <string>

#include "bench/simulation/BodySizes.h"
#include "bench/simulation/Config.h"
#include "bench/simulation/Summary.h"
#include "bench/simulation/Tally.h"

namespace Fleet {

/// Everything that there is to say about a run.
struct Result {
    const Config& config;
    const BodySizes& sizes;
    const Tally& tally;
    const Summary& summary;
    double took = 0; ///< Seconds.
};

/// For people; with `hours`, a line for each.
std::string AsTable(const Result& result, bool hours);

/// For programs. The same for the same seed, so without the time that the run took.
std::string AsJson(const Result& result);

} // namespace Fleet
