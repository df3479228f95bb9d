// Simulates a fleet of desktops and its collectors. docs/Fleet.md says what for, and --help lists the
// options.
#include <atomic>
#include <chrono>
#include <cmath>
#include <functional>
#include <map>
#include <thread>
#include <vector>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "bench/simulation/Output.h"
#include "bench/simulation/Shard.h"

namespace {

using namespace Fleet;

/// Options in a person's units. Complete turns them into a Config.
struct Options {
    double outageHours = 0;
    double outageAt = 10;
    double restartAt = -1;
    double capacity = 0;
    double returnCapacity = -1;
    double queueSeconds = 2;
    unsigned threads = std::max(1U, std::thread::hardware_concurrency());
    bool json = false;
    bool hours = false;
};

Tick Hours(double hours) {
    return static_cast<Tick>(std::lround(hours * HOUR));
}

/// What the whole fleet stores in a second of a working day.
double BusyRate(const Config& config) {
    return config.desktops * config.eventsPerDay * SECOND / USED;
}

/// A range as --help tells it.
template <typename Number>
CLI::Validator From(Number least, Number most) {
    return CLI::Range(least, most).description(fmt::format("from {} to {}", least, most));
}

CLI::Validator NotNegative() {
    auto check = CLI::NonNegativeNumber;
    return check.description("0 or more");
}

void AddFleet(CLI::App& app, Config& config, Options& options) {
    app.add_option("--desktops", config.desktops, "Desktops")
        ->check(From(1, 2'000'000))
        ->capture_default_str();
    app.add_option("--days", config.days,
                   "Working days; by default as many as an outage needs to its second midnight")
        ->check(From(1, 40));
    app.add_option("--events", config.eventsPerDay, "Events of a desktop and day")
        ->check(From(2, 100'000))
        ->capture_default_str();
    app.add_option("--seed", config.seed, "The same seed gives the same figures")->capture_default_str();
    app.add_option("--restart", options.restartAt,
                   "All services that run start anew at this hour, such as 10.5");
    app.add_option("--threads", options.threads, "Threads; they change no figure")->check(From(1, 256));
    app.add_flag("--json", options.json, "Write JSON");
    app.add_flag("--hours", options.hours, "A line for each hour, too");
}

void AddCollectors(CLI::App& app, Config& config, Options& options) {
    static const std::map<std::string, Away> WAYS{
        {"refused", Away::Refused}, {"503", Away::Answers503}, {"silent", Away::Silent}};
    app.add_option("--collectors", config.collectors,
                   "Collectors behind the balancer; by default one for each 50,000 desktops. Without a "
                   "capacity, their number changes no figure")
        ->check(From(1, 1000));
    app.add_option("--capacity", options.capacity,
                   "What they take, as a multiple of the working day's mean rate of events; 0: everything")
        ->check(NotNegative());
    app.add_option("--outage", options.outageHours, "Hours for which they are away")->check(From(0.0, 900.0));
    app.add_option("--outage-at", options.outageAt, "The hour at which they go")
        ->check(From(0.0, 900.0))
        ->capture_default_str();
    app.add_option("--away", config.away, "What a desktop sees then: refused, 503 or silent")
        ->transform(CLI::CheckedTransformer(WAYS).description(""));
    app.add_flag("--announced", config.isAnnounced,
                 "Their 503 has a Retry-After with the time of their return")
        ->needs("--away");
    app.add_option("--return-capacity", options.returnCapacity, "--capacity after the outage")
        ->check(NotNegative());
    app.add_option("--queue", options.queueSeconds,
                   "Seconds of work that a collector accepts ahead; then it says 503")
        ->check(From(0.0, 600.0))
        ->capture_default_str();
    app.add_option("--retry-after", config.retryAfter, "Seconds that its 503 asks for")
        ->check(From(0, 86'400));
}

/// The settings of the rules, so that one can see what each of them does.
void AddRules(CLI::App& app, MetrikSdk::OutboxSettings& settings) {
    const auto add = [&](const char* name, std::chrono::milliseconds& value, const char* text) {
        const auto set = [&value](double seconds) {
            value = std::chrono::milliseconds(std::llround(seconds * 1000));
        };
        app.add_option_function<double>(name, set, text)->check(NotNegative())->group("Rules");
    };
    add("--start-spread", settings.retry.startSpread,
        "Seconds within which the first request after a start goes");
    add("--retry-after-spread", settings.retry.maxRetryAfterSpread,
        "Seconds by which a Retry-After is exceeded at most");
    add("--linger", settings.batch.linger, "Seconds that an event waits for others");
    add("--max-wait", settings.retry.maxWait, "The longest wait between two tries, in seconds");
    add("--max-age", settings.caps.maxAge, "The age at which events are dropped, in seconds");
    app.add_option("--max-bytes", settings.caps.maxWaitingBytes, "Bytes at which an outbox is full")
        ->group("Rules");
}

/// --help names no type of the program's language.
void NameValues(CLI::App& app) {
    for (auto* option :
         app.get_options([](const CLI::Option* each) { return each->get_items_expected_max() > 0; }))
        option->type_name("NUMBER");
    app.get_option("--away")->type_name("WORD");
}

/// Without a capacity, desktops are independent of each other. Fewer of them at once fit the processor's
/// cache, and then the simulation is faster.
unsigned DesktopsOfACollector(const Config& config) {
    return config.capacity > 0 || config.returnCapacity > 0 ? 50'000 : 5'000;
}

void Complete(Config& config, const Options& options, bool hasDays) {
    config.capacity = options.capacity * BusyRate(config);
    config.returnCapacity =
        options.returnCapacity < 0 ? config.capacity : options.returnCapacity * BusyRate(config);
    config.queue = static_cast<Tick>(options.queueSeconds * SECOND);
    if (config.collectors == 0)
        config.collectors = 1 + (config.desktops - 1) / DesktopsOfACollector(config);
    config.collectors = std::min(config.collectors, config.desktops);
    if (options.restartAt >= 0)
        config.restartAt = Hours(options.restartAt);
    if (options.outageHours <= 0)
        return;
    config.outageFrom = Hours(options.outageAt);
    config.outageTo = config.outageFrom + Hours(options.outageHours);
    if (!hasDays)
        config.days = config.outageTo / DAY + 2;
}

Tally Simulate(const Config& config, const BodySizes& sizes, unsigned threads) {
    Tally sum(config.End());
    std::vector<Tally> tallies(std::min(threads, config.collectors), sum);
    std::atomic<unsigned> next = 0;
    const auto work = [&](Tally& tally) {
        for (unsigned i = next++; i < config.collectors; i = next++) {
            const auto first = [&](std::uint64_t shard) {
                return static_cast<std::uint32_t>(shard * config.desktops / config.collectors);
            };
            Shard(config, sizes, first(i), first(i + 1) - first(i), tally).Run();
        }
    };
    std::vector<std::thread> workers;
    workers.reserve(tallies.size());
    for (auto& tally : tallies)
        workers.emplace_back(work, std::ref(tally));
    for (auto& worker : workers)
        worker.join();
    for (const auto& tally : tallies)
        sum.Add(tally);
    return sum;
}

} // namespace

int main(int argc, char** argv) {
    CLI::App app("A fleet of desktops and its collectors, simulated with the rules of the service.",
                 "bench/fleet");
    Config config;
    Options options;
    AddFleet(app, config, options);
    AddCollectors(app, config, options);
    AddRules(app, config.settings);
    NameValues(app);
    CLI11_PARSE(app, argc, argv);
    Complete(config, options, app.count("--days") > 0);

    const auto began = std::chrono::steady_clock::now();
    const BodySizes sizes(config.seed, config.settings.batch.maxEvents);
    config.eventBytes = sizes.EventBytes();
    const auto tally = Simulate(config, sizes, options.threads);
    const Summary summary(config, tally);
    const std::chrono::duration<double> took = std::chrono::steady_clock::now() - began;
    const Result result{config, sizes, tally, summary, took.count()};
    fmt::print("{}", options.json ? AsJson(result) : AsTable(result, options.hours));
    return 0;
}
