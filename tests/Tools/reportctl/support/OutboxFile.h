#pragma once

#include <string>

#include <SQLiteCpp/Database.h>

#include "Modules/MetrikSdk/outbox/OutboxSchema.h"

/// Makes an outbox as the service leaves it: one event is waiting, two were refused.
inline void MakeOutbox(const std::string& path) {
    SQLite::Database outbox(path, SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
    outbox.exec("pragma journal_mode = wal");
    outbox.exec(MetrikSdk::outbox::TABLES);
    outbox.exec(MetrikSdk::outbox::TRIGGER_AND_VIEW);
    outbox.exec("pragma application_id = " + std::to_string(MetrikSdk::outbox::APPLICATION_ID));
    outbox.exec("pragma user_version = " + std::to_string(MetrikSdk::outbox::SCHEMA_VERSION));
    outbox.exec(R"sql(
        insert into totals(id, outbox_id, dead_lettered, removed_bytes, dead_letters, dead_letter_bytes)
            values(1, 'o', 2, 200, 2, 200);
        insert into module(module_id) values('A100');
        insert into module_release(module, version, name) values(1, '1', 'n');
        update module set last_sequence = 2, stored_bytes = 200;
        insert into event(uuid, module, release, sequence, event_id, payload, stored_ms, bytes)
            values('u-3', 1, 1, 3, 'A100|3', '{}', 1700000000000, 100);
        insert into dead_letter(uuid, module, release, sequence, event_id, payload, stored_ms, bytes,
                refused_ms, status, reason)
            values('u-1', 1, 1, 1, 'A100|1', '{"a":1}', 1700000000000, 100, 1700000001000, 400, 'too odd'),
                  ('u-2', 1, 1, 2, 'A100|2', '{}', 1700000000000, 100, 1700000001000, 413,
                   char(27) || '[31mred');
    )sql");
}
