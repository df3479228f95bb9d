#include <benchmark/benchmark.h>
#include <rapidjson/document.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include "SystemTool/IO/JsonDocument.h"
#include "bench/Report.h"

// One report of 180 bytes: it is parsed, its four members are read, and the object among them is printed.
namespace {

void BareLibrary(benchmark::State& state) {
    const std::string report = ReportOf180Bytes();
    for (auto _ : state) {
        rapidjson::Document document;
        document.Parse<rapidjson::kParseFullPrecisionFlag>(report.data(), report.size());
        rapidjson::StringBuffer text;
        rapidjson::Writer<rapidjson::StringBuffer> writer(text);
        document["value"].Accept(writer);
        benchmark::DoNotOptimize(document["eventID"].GetString());
        benchmark::DoNotOptimize(document["createTime"].GetInt64());
        benchmark::DoNotOptimize(document["isDayReport"].GetInt());
        benchmark::DoNotOptimize(text.GetString());
    }
    state.SetItemsProcessed(state.iterations());
}

void Document(benchmark::State& state) {
    const std::string report = ReportOf180Bytes();
    for (auto _ : state) {
        std::string error;
        SystemTool::IO::JsonDocument document;
        document.FromJson(report, error);
        benchmark::DoNotOptimize(document.GetKeyValue("eventID").ToString());
        benchmark::DoNotOptimize(document.GetKeyValue("value").ToJson());
        benchmark::DoNotOptimize(document.GetKeyValue("createTime").ToLongLong());
        benchmark::DoNotOptimize(document.GetKeyValue("isDayReport").ToInt());
    }
    state.SetItemsProcessed(state.iterations());
}

/// Reads one member of an object with as many members as the argument says. The time should not depend on the
/// size, because nothing is copied.
void MemberOfALargeDocument(benchmark::State& state) {
    std::string text = "{";
    for (std::int64_t i = 0; i < state.range(0); ++i)
        text += "\"filler" + std::to_string(i) + "\":\"" + std::string(50, 'x') + "\",";
    text += R"("value":{"a":1}})";
    std::string error;
    SystemTool::IO::JsonDocument document;
    document.FromJson(text, error);
    for (auto _ : state)
        benchmark::DoNotOptimize(document.GetKeyValue("filler0"));
    state.SetItemsProcessed(state.iterations());
}

} // namespace

BENCHMARK(BareLibrary);
BENCHMARK(Document);
BENCHMARK(MemberOfALargeDocument)->Arg(10)->Arg(1000)->Arg(100'000);
