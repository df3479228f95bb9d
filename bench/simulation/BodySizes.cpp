#include "bench/simulation/BodySizes.h"

#include <fmt/format.h>

#include "Modules/MetrikSdk/otlp/Gzip.h"
#include "Modules/MetrikSdk/otlp/OtlpEncoder.h"
#include "Modules/MetrikSdk/outbox/PruneRule.h"
#include "bench/simulation/Config.h"

namespace Fleet {
namespace {

constexpr std::size_t MEASURED[] = {1, 2, 5, 10, 20, 50, 100, 200, 512};

std::string Uuid(Random& random) {
    const auto a = random.Next();
    const auto b = random.Next();
    return fmt::format("0190b6a3-{:04x}-7{:03x}-a{:03x}-{:012x}", a & 0xffffU, (a >> 16U) & 0xfffU,
                       (a >> 32U) & 0xfffU, b & 0xffffffffffffU);
}

/// A payload as MetrikWorker writes it. Payloads differ in their values, and have the same names.
std::string Payload(Random& random, std::int64_t time) {
    return fmt::format(R"({{"extend":{{"hublinkVersion":"5.1.0.2","createTime":"{}"}},)"
                       R"("eventData":{{"clicks":{},"page":"page-{}","duration":{},"ok":{},)"
                       R"("openid":"u4711","sys_version":"Debian GNU/Linux 12 (bookworm) 6.1.0"}}}})",
                       time, random.Next() % 100, random.Next() % 40, random.Next() % 60'000,
                       random.Next() % 2 == 0);
}

MetrikSdk::Batch BatchOf(std::size_t count, std::uint64_t seed) {
    Random random(seed);
    MetrikSdk::Batch batch;
    batch.outboxId = Uuid(random);
    batch.releases[1] = {"A759", "5.1.0.2", "editor"};
    for (std::size_t i = 0; i < count; ++i) {
        const auto time =
            1'795'000'000'000 + static_cast<std::int64_t>(i * 150'000 + random.Next() % 100'000);
        MetrikSdk::StoredEvent event;
        event.row = static_cast<std::int64_t>(i) + 1;
        event.uuid = Uuid(random);
        event.release = 1;
        event.sequence = event.row;
        event.eventId = fmt::format("A759|{}", 10'000 + random.Next() % 50);
        event.payload = Payload(random, time);
        event.storedAt = MetrikSdk::WallTime(std::chrono::milliseconds(time + 2));
        batch.events.push_back(std::move(event));
    }
    return batch;
}

BodySizes::Size Measure(std::size_t count, std::uint64_t seed) {
    const auto body = MetrikSdk::otlp::EncodeOtlp(BatchOf(count, seed));
    return {body.size(), MetrikSdk::otlp::Gzip(body).size()};
}

} // namespace

BodySizes::BodySizes(std::uint64_t seed, std::size_t maxEvents) : m_sizes(maxEvents + 1) {
    std::size_t from = 0;
    for (auto to : MEASURED) {
        const auto& low = m_sizes[from];
        const auto high = Measure(to, seed);
        for (auto n = from + 1; n <= std::min(to, maxEvents); ++n)
            m_sizes[n] = {low.plain + (high.plain - low.plain) * (n - from) / (to - from),
                          low.sent + (high.sent - low.sent) * (n - from) / (to - from)};
        from = to;
        if (from >= maxEvents)
            break;
    }
    const auto event = BatchOf(1, seed).events.front();
    m_eventBytes = MetrikSdk::outbox::PruneRule::BytesOf({event.uuid, event.eventId, event.payload, {}});
}

} // namespace Fleet
