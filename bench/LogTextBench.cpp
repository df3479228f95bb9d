#include <string>

#include <benchmark/benchmark.h>
#include <boost/format.hpp>

#include "Common/LogText.h"
#include "bench/Report.h"

// Builds the text of a datagram's log record. The datagram itself is the format.
namespace {

/// Measures how long it takes to build the text, or to throw the exception when it cannot be built.
template <typename MakeText>
void Measure(benchmark::State& state, MakeText makeText) {
    for (auto _ : state) {
        try {
            benchmark::DoNotOptimize(makeText());
        } catch (const std::exception& error) {
            benchmark::DoNotOptimize(error.what());
        }
    }
}

void Build(benchmark::State& state, const std::string& datagram) {
    Measure(state, [&] {
        return SyncServiceReport::IsOwnText(datagram) ? datagram.size()
                                                      : SyncServiceReport::BuildLogText(datagram).size();
    });
}

void BareFormat(benchmark::State& state, const std::string& datagram) {
    Measure(state, [&] { return boost::format(datagram).str().size(); });
}

/// A datagram that is filled with `directive`.
std::string DatagramOf(const std::string& directive) {
    constexpr std::size_t DATAGRAM_BYTES = 10240;
    std::string datagram;
    while (datagram.size() + directive.size() <= DATAGRAM_BYTES)
        datagram += directive;
    return datagram;
}

} // namespace

BENCHMARK_CAPTURE(BareFormat, PlainText, ReportOf180Bytes());
BENCHMARK_CAPTURE(Build, PlainText, ReportOf180Bytes());
BENCHMARK_CAPTURE(BareFormat, WithAPercentSign, ReportOf180Bytes() + "%%");
BENCHMARK_CAPTURE(Build, WithAPercentSign, ReportOf180Bytes() + "%%");
BENCHMARK_CAPTURE(BareFormat, DoubledPercentSigns, DatagramOf("%%"));
BENCHMARK_CAPTURE(Build, DoubledPercentSigns, DatagramOf("%%"));
BENCHMARK_CAPTURE(BareFormat, Tabulations, DatagramOf("%t"));
BENCHMARK_CAPTURE(Build, Tabulations, DatagramOf("%t"));
BENCHMARK_CAPTURE(BareFormat, Arguments, DatagramOf("%s"));
BENCHMARK_CAPTURE(Build, Arguments, DatagramOf("%s"));
BENCHMARK_CAPTURE(BareFormat, NumberedArguments, DatagramOf("%1%"));
BENCHMARK_CAPTURE(Build, NumberedArguments, DatagramOf("%1%"));
BENCHMARK_CAPTURE(Build, TabulationsFilledWithPercentSigns, DatagramOf("%1T%"));
