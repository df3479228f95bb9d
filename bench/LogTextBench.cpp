#include <string>

#include <benchmark/benchmark.h>
#include <boost/format.hpp>

#include "Common/LogText.h"
#include "bench/Report.h"

// The text of a datagram's log record. The datagram is its own format.
namespace {

void Build(benchmark::State& state, const std::string& datagram) {
    for (auto _ : state)
        benchmark::DoNotOptimize(SyncServiceReport::IsOwnText(datagram)
                                     ? datagram.size()
                                     : SyncServiceReport::BuildLogText(datagram).size());
}

void BareFormat(benchmark::State& state, const std::string& datagram) {
    for (auto _ : state)
        benchmark::DoNotOptimize(boost::format(datagram).str());
}

} // namespace

BENCHMARK_CAPTURE(BareFormat, PlainText, ReportOf180Bytes());
BENCHMARK_CAPTURE(Build, PlainText, ReportOf180Bytes());
BENCHMARK_CAPTURE(BareFormat, WithAPercentSign, ReportOf180Bytes() + "%%");
BENCHMARK_CAPTURE(Build, WithAPercentSign, ReportOf180Bytes() + "%%");
