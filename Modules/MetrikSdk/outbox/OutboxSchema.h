#pragma once

/// The outbox as a database. docs/Outbox.md shows people how to read it; a change of any name here is a
/// change there, and a new SCHEMA_VERSION.
namespace MetrikSdk::outbox {

/// "MOBX": lets file(1) and a person tell an outbox from another database.
constexpr int APPLICATION_ID = 0x4d4f4258;
constexpr int SCHEMA_VERSION = 1;

/// The trigger keeps the sums right in the very statement that stores an event, so that storing is one
/// statement, and nothing ever has to count the events.
constexpr const char* SCHEMA = R"sql(
CREATE TABLE module(
    id            INTEGER PRIMARY KEY,
    module_id     TEXT    NOT NULL UNIQUE,
    last_sequence INTEGER NOT NULL DEFAULT 0,
    stored_bytes  INTEGER NOT NULL DEFAULT 0);
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
    dead_letter_bytes    INTEGER NOT NULL DEFAULT 0);
CREATE TRIGGER event_stored AFTER INSERT ON event BEGIN
    UPDATE module SET last_sequence = NEW.sequence, stored_bytes = stored_bytes + NEW.bytes
        WHERE id = NEW.module;
END;
CREATE VIEW outbox_status AS
    SELECT outbox_id, stored, delivered, refused, dead_lettered, dropped,
           stored - delivered - refused - dead_lettered - dropped AS waiting,
           stored_bytes - removed_bytes AS waiting_bytes, dead_letters, dead_letter_bytes
    FROM totals, (SELECT coalesce(sum(last_sequence), 0) AS stored,
                         coalesce(sum(stored_bytes), 0) AS stored_bytes FROM module);
)sql";

} // namespace MetrikSdk::outbox
