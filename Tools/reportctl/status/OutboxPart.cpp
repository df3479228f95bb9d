#include <algorithm>
#include <charconv>
#include <map>

#include <fmt/format.h>

#include "Modules/MetrikSdk/otlp/EndpointConfig.h"
#include "Tools/reportctl/service/Processes.h"
#include "Tools/reportctl/status/Parts.h"
#include "Tools/reportctl/store/Store.h"

namespace reportctl::status {
namespace {

/// Up to so many waiting events are counted by module. Counting reads the whole table: it has no index by
/// module, because an index would make storing an event slower.
constexpr std::int64_t MOST_TOLD_APART = 20'000;

/// A UUID of version 7 begins with the time at which it was made.
std::optional<std::int64_t> TimeOf(const std::string& uuid) {
    constexpr std::size_t VERSION_AT = 14;
    if (uuid.size() <= VERSION_AT || uuid[VERSION_AT] != '7' || uuid[8] != '-')
        return std::nullopt;
    const auto digits = uuid.substr(0, 8) + uuid.substr(9, 4);
    std::int64_t ms = 0;
    const auto parsed = std::from_chars(digits.data(), digits.data() + digits.size(), ms, 16);
    const bool isTime = parsed.ec == std::errc() && parsed.ptr == digits.data() + digits.size();
    return isTime ? std::optional(ms) : std::nullopt;
}

void ReadTotals(SQLite::Database& database, Outbox& outbox) {
    // An outbox of version 1 never forgets a module, and does not record when it delivered last.
    const bool isOld = database.execAndGet("pragma user_version").getInt() < 2;
    SQLite::Statement totals(
        database,
        fmt::format("select delivered, refused, dead_lettered, dropped, dead_letters, removed_bytes, "
                    "(select coalesce(sum(last_sequence), 0) from module) + {}, "
                    "(select coalesce(sum(stored_bytes), 0) from module) + {}, {}, outbox_id from totals",
                    isOld ? "0" : "forgotten_stored", isOld ? "0" : "forgotten_bytes",
                    isOld ? "null" : "last_delivered_ms"));
    if (!totals.executeStep())
        return;
    const auto number = [&](int column) { return totals.getColumn(column).getInt64(); };
    outbox.delivered = number(0);
    outbox.refused = number(1);
    outbox.dropped = number(3);
    outbox.deadLetters = number(4);
    outbox.waiting = number(6) - number(0) - number(1) - number(2) - number(3);
    outbox.waitingBytes = number(7) - number(5);
    if (!totals.getColumn(8).isNull())
        outbox.lastDeliveredAtMs = number(8);
    outbox.id = totals.getColumn(9).getString();
    outbox.begunAtMs = TimeOf(*outbox.id);
}

/// How many events of each module wait, by the module's key.
std::map<std::int64_t, std::int64_t> WaitingByModule(SQLite::Database& database) {
    std::map<std::int64_t, std::int64_t> waiting;
    SQLite::Statement counts(database, "select module, count(*) from event group by module");
    while (counts.executeStep())
        waiting[counts.getColumn(0).getInt64()] = counts.getColumn(1).getInt64();
    return waiting;
}

/// An outbox of which no upload ever failed has no such table.
void ReadUploadFailure(SQLite::Database& database, Outbox& outbox) {
    if (!database.tableExists("upload_failure"))
        return;
    SQLite::Statement failure(database, "select at_ms, text from upload_failure");
    if (!failure.executeStep())
        return;
    outbox.uploadFailedAtMs = failure.getColumn(0).getInt64();
    outbox.uploadFailure = failure.getColumn(1).getString();
}

void ReadModules(SQLite::Database& database, Outbox& outbox) {
    const bool areToldApart = outbox.waiting.value_or(0) <= MOST_TOLD_APART;
    auto waiting = areToldApart ? WaitingByModule(database) : std::map<std::int64_t, std::int64_t>();
    SQLite::Statement modules(database, "select id, module_id, last_sequence from module order by id");
    while (modules.executeStep())
        outbox.modules.push_back(
            {modules.getColumn(1).getString(),
             areToldApart ? std::optional(waiting[modules.getColumn(0).getInt64()]) : std::nullopt,
             modules.getColumn(2).getInt64()});
    if (outbox.modules.size() == 1)
        outbox.modules.front().waiting = outbox.waiting;
}

/// The collector's address, read from the service's environment as the service's SDK read it at the start.
std::optional<std::string> EndpointOf(const Service& service) {
    if (!service.process)
        return std::nullopt;
    std::vector<std::string> complaints;
    std::vector<std::string> kept; // the texts must live until ReadEndpoint has returned
    kept.reserve(64);
    const auto lookUp = [&](const char* name) -> const char* {
        const auto value = service::EnvironmentOf(*service.process, name);
        return value ? kept.emplace_back(*value).c_str() : nullptr;
    };
    const auto config = MetrikSdk::otlp::ReadEndpoint(lookUp, complaints);
    return config ? std::optional(MetrikSdk::otlp::WithoutSecrets(config->url)) : std::nullopt;
}

} // namespace

Outbox LookAtOutbox(const std::string& path, const Service& service) {
    Outbox outbox;
    outbox.path = path;
    outbox.endpoint = EndpointOf(service);
    outbox.isPresent = IsFile(path, outbox.problem);
    if (!outbox.isPresent)
        return outbox;
    try {
        auto database = store::OpenToGlance(path);
        ReadTotals(database, outbox);
        ReadUploadFailure(database, outbox);
        ReadModules(database, outbox);
    } catch (const std::exception& failure) {
        outbox.problem = failure.what();
    }
    return outbox;
}

} // namespace reportctl::status
