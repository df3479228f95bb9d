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
INSERT INTO totals(id, outbox_id) VALUES(1, '01890000-0000-7000-8000-000000000000');
INSERT INTO module(id, module_id) VALUES(1, 'A759');
INSERT INTO module_release VALUES(1, 1, '1', 'default');
INSERT INTO event SELECT 1, 'uuid-1', 1, 1, 1, 'A759|1', '{"n":1}', 1700000000000, 93;
INSERT INTO event SELECT 2, 'uuid-2', 1, 1, 2, 'A759|1', '{"n":2}', 1700000000000, 93;
INSERT INTO event SELECT 3, 'uuid-3', 1, 1, 3, 'A759|1', '{"n":3}', 1700000000000, 93;
DELETE FROM event WHERE id = 1;
UPDATE totals SET delivered = 1, removed_bytes = 93;
PRAGMA application_id = 1297039960;
PRAGMA user_version = 1;
