// page_sample FILE [RELOAD-SECONDS [AT-MS]]: writes a page with known numbers and hostile texts. A test
// opens the page in a browser.

#include <cstdlib>
#include <fstream>

#include "Tools/reportctl/page/Page.h"

namespace {

using reportctl::page::PageData;
using reportctl::page::RefusedAt;

constexpr auto STATUS =
    R"json({"verdict": "degraded", "reasons":
 ["12 reports were refused by the store: </script><script>document.title='forged'</script>"],
 "service": {"running": true, "pid": 4711, "startedAt": "2026-11-21T14:05:06.789Z", "uptimeSeconds": 61.5,
             "version": "0.2.0", "buildId": "9f", "listening": true,
             "portHolder": {"pid": 4711, "name": "SyncServiceReport", "user": "u1"},
             "plugins": {"logger": true, "store": true, "sdk": false}},
 "ledger": {"balanced": true,
            "total": {"received": 123456, "receivedBytes": 9, "empty": 1, "atSizeLimit": 0,
                      "unformattable": 0, "droppedByKernel": 77, "waiting": 3, "mostWaiting": 9,
                      "stored": 120000, "toAnalytics": 3000, "control": 40, "otherControl": 2,
                      "refused": {"notJson": 398, "store": 12, "noStore": 0, "moduleNotInit": 0,
                      "eventIdWithoutBar": 0, "valueNotJson": 0, "analytics": 0, "exception": 0},
                      "lostAtEnds": 0},
            "lastReceivedAt": "2026-11-21T14:06:06.789Z"},
 "store": {"path": "/x/Report.db", "present": true, "bytes": 1, "walBytes": 0, "schemaVersion": 2,
           "rows": 120000, "newestCreateTime": null},
 "outbox": {"path": "/x/MetrikOutbox.db", "present": true, "waiting": 55, "waitingBytes": 4096,
            "delivered": 2945, "refused": 0, "deadLetters": 1, "dropped": 0,
            "modules": [{"id": "A759<img src=x onerror=alert(1)>", "waiting": 55, "lastSequence": 3000}],
            "endpoint": "https://collector.example:4318", "lastFailure": null},
 "log": {"directory": "/x", "bytes": 0, "errors": 1, "warnings": 0,
         "last": [{"time": "2026-11-21T14:05:06.789Z", "level": "ERROR", "site": "Frame/DBHelper:1 ExecSql",
                   "text": "<b>bold</b> & <!-- "}]},
 "disk": {"freeBytes": 104857600}})json";

constexpr std::int64_t AT_MS = 1'795'270'000'000; // not a full hour

PageData Sample(int reloadSeconds, std::int64_t atMs) {
    PageData data;
    data.generatedAtMs = atMs;
    data.reloadSeconds = reloadSeconds;
    data.statusJson = STATUS;
    const auto now = data.generatedAtMs / 900'000;
    data.quarterHours = {{now - 96 * 10, 1000}, {now - 4, 20}, {now, 7}};
    data.rowsBefore = 500;
    data.events = {{"B100|<script>document.title='forged'</script>", 1020}, {std::string(10'000, 'x'), 7}};
    data.modules = {{"B100", 1020}, {std::nullopt, 7}};
    data.refused = {RefusedAt{data.generatedAtMs - 10'000, {{"notJson", 4}, {"store", 12}}}};
    return data;
}

} // namespace

int main(int argc, char** argv) {
    std::ofstream file(argv[1]);
    const auto sample = Sample(argc > 2 ? std::atoi(argv[2]) : 0, argc > 3 ? std::atoll(argv[3]) : AT_MS);
    file << ComposePage(sample, reportctl::page::RandomNonce());
    return file.good() ? 0 : 1;
}
