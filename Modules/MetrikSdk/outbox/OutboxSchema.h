#pragma once

/// The outbox as a database. docs/Outbox.md shows people how to read it. A change of a name here needs the
/// same change there, and a new SCHEMA_VERSION.
namespace MetrikSdk::outbox {

/// "MOBX": file(1) and people can tell an outbox from another database by it.
constexpr int APPLICATION_ID = 0x4d4f4258;
constexpr int SCHEMA_VERSION = 2;

constexpr const char* TABLES = R"sql(
CREATE TABLE module(
    id            INTEGER PRIMARY KEY,
    module_id     TEXT    NOT NULL UNIQUE,
    last_sequence INTEGER NOT NULL DEFAULT 0,
    stored_bytes  INTEGER NOT NULL DEFAULT 0,
    last_event    INTEGER NOT NULL DEFAULT 0,
    removed_bytes INTEGER NOT NULL DEFAULT 0);
CREATE TABLE module_release(
    id      INTEGER PRIMARY KEY,
    module  INTEGER NOT NULL REFERENCES module(id),
    version TEXT    NOT NULL,
    name    TEXT    NOT NULL,
    UNIQUE(module, version, name));
CREATE TABLE event(
    id        INTEGER PRIMARY KEY,
    uuid      TEXT    NOT NULL,
    module    INTEGER NOT NULL REFERENCES module(id),
    release   INTEGER NOT NULL REFERENCES module_release(id),
    sequence  INTEGER NOT NULL,
    event_id  TEXT    NOT NULL,
    payload   TEXT    NOT NULL,
    stored_ms INTEGER NOT NULL,
    bytes     INTEGER NOT NULL);
CREATE TABLE dead_letter(
    id         INTEGER PRIMARY KEY,
    uuid       TEXT    NOT NULL,
    module     INTEGER NOT NULL REFERENCES module(id),
    release    INTEGER NOT NULL REFERENCES module_release(id),
    sequence   INTEGER NOT NULL,
    event_id   TEXT    NOT NULL,
    payload    TEXT    NOT NULL,
    stored_ms  INTEGER NOT NULL,
    bytes      INTEGER NOT NULL,
    refused_ms INTEGER NOT NULL,
    status     INTEGER NOT NULL,
    reason     TEXT    NOT NULL);
CREATE TABLE totals(
    id                   INTEGER PRIMARY KEY CHECK (id = 1),
    outbox_id            TEXT    NOT NULL,
    delivered            INTEGER NOT NULL DEFAULT 0,
    refused              INTEGER NOT NULL DEFAULT 0,
    dead_lettered        INTEGER NOT NULL DEFAULT 0,
    dropped              INTEGER NOT NULL DEFAULT 0,
    removed_bytes        INTEGER NOT NULL DEFAULT 0,
    dead_letters         INTEGER NOT NULL DEFAULT 0,
    dead_letter_bytes    INTEGER NOT NULL DEFAULT 0,
    forgotten_stored     INTEGER NOT NULL DEFAULT 0,
    forgotten_bytes      INTEGER NOT NULL DEFAULT 0,
    last_delivered_ms    INTEGER);
)sql";

/// The failure with which uploads began to fail last. It lasts as long as at_ms is later than
/// last_delivered_ms of the totals. The table is made with the first failure, because files of this version
/// can be without it.
constexpr const char* UPLOAD_FAILURE = R"sql(
CREATE TABLE IF NOT EXISTS upload_failure(
    id    INTEGER PRIMARY KEY CHECK (id = 1),
    at_ms INTEGER NOT NULL,
    text  TEXT    NOT NULL);
)sql";

/// Changes version 1 into this version. Version 1 kept its modules for ever. It does not say which modules
/// have an event waiting. So every module counts as having one, until the newest event that waits now has
/// left.
constexpr const char* MIGRATION = R"sql(
ALTER TABLE module ADD COLUMN last_event INTEGER NOT NULL DEFAULT 0;
UPDATE module SET last_event = (SELECT coalesce(max(id), 0) FROM event);
ALTER TABLE module ADD COLUMN removed_bytes INTEGER NOT NULL DEFAULT 0;
UPDATE module SET removed_bytes = stored_bytes;
UPDATE module SET removed_bytes = stored_bytes - waiting.bytes
    FROM (SELECT module, sum(bytes) AS bytes FROM event GROUP BY module) AS waiting
    WHERE waiting.module = module.id;
ALTER TABLE totals ADD COLUMN forgotten_stored INTEGER NOT NULL DEFAULT 0;
ALTER TABLE totals ADD COLUMN forgotten_bytes INTEGER NOT NULL DEFAULT 0;
ALTER TABLE totals ADD COLUMN last_delivered_ms INTEGER;
DROP TRIGGER event_stored;
DROP VIEW outbox_status;
)sql";

/// The triggers keep the sums right within the statement that changes an event. So storing is one statement,
/// and the events never have to be counted.
///
/// The space that a module's rows and their indexes take is estimated from above: a text over some 200 bytes
/// takes a page of its own in an index.
constexpr const char* TRIGGER_AND_VIEW = R"sql(
CREATE INDEX dead_letter_module ON dead_letter(module);
CREATE TRIGGER event_stored AFTER INSERT ON event BEGIN
    UPDATE module SET last_sequence = NEW.sequence, stored_bytes = stored_bytes + NEW.bytes,
                      last_event = NEW.id
        WHERE id = NEW.module;
END;
CREATE TRIGGER event_removed AFTER DELETE ON event BEGIN
    UPDATE module SET removed_bytes = removed_bytes + OLD.bytes WHERE id = OLD.module;
END;
CREATE TRIGGER delivered AFTER UPDATE OF delivered ON totals WHEN NEW.delivered > OLD.delivered BEGIN
    UPDATE totals SET last_delivered_ms = CAST((julianday('now') - 2440587.5) * 86400000 + 0.5 AS INTEGER);
END;
CREATE VIEW outbox_status AS
    SELECT outbox_id, stored, delivered, refused, dead_lettered, dropped,
           stored - delivered - refused - dead_lettered - dropped AS waiting,
           stored_bytes - removed_bytes AS waiting_bytes, dead_letters, dead_letter_bytes, modules,
           module_text_bytes + release_bytes AS module_bytes
    FROM (SELECT totals.*, forgotten_stored + in_modules AS stored,
                 forgotten_bytes + bytes_in_modules AS stored_bytes, modules, module_text_bytes
          FROM totals, (SELECT count(*) AS modules, coalesce(sum(last_sequence), 0) AS in_modules,
                               coalesce(sum(stored_bytes), 0) AS bytes_in_modules,
                               coalesce(sum(150 + 3 * octets + (octets > 200) * 1024), 0) AS module_text_bytes
                        FROM (SELECT *, length(CAST(module_id AS BLOB)) AS octets FROM module))),
         (SELECT coalesce(sum(150 + 3 * octets + (octets > 200) * 1024), 0) AS release_bytes
          FROM (SELECT length(CAST(version AS BLOB)) + length(CAST(name AS BLOB)) AS octets FROM module_release));
)sql";

} // namespace MetrikSdk::outbox
