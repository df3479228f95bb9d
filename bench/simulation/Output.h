#pragma once

#include <string>

#include "bench/simulation/BodySizes.h"
#include "bench/simulation/Config.h"
#include "bench/simulation/Summary.h"
#include "bench/simulation/Tally.h"

namespace Fleet {

/// The input and the outcome of a run.
struct Result {
    const Config& config;
    const BodySizes& sizes;
    const Tally& tally;
    const Summary& summary;
    double took = 0; ///< Seconds.
};

/// A table for people; with `hours`, it has a line for each hour, too.
std::string AsTable(const Result& result, bool hours);

/// JSON for programs. It leaves out the time that the run took, so that the same seed gives the same text.
std::string AsJson(const Result& result);

} // namespace Fleet
