-- The tables of events.sql for an old engine: Debian 12's clickhouse-server is of 2018 (18.16) and has no
-- Map, no DateTime64, no codecs and no TTL. Run it once:
--
--     clickhouse-client --multiquery < events-old.sql
--
-- The collector's exporter writes Map and DateTime64, so it cannot write into this engine. The program that
-- loads the rows gives the time as a text, and each map as two lists, of its keys and of its values. No row
-- is deleted by age: drop the oldest partitions yourself (ALTER TABLE hublink.otel_logs DROP PARTITION ...).
-- The queries are the same for both.

CREATE DATABASE IF NOT EXISTS hublink;

CREATE TABLE IF NOT EXISTS hublink.otel_logs
(
    Timestamp          String,
    TraceId            String,
    SpanId             String,
    TraceFlags         UInt8,
    SeverityText       String,
    SeverityNumber     UInt8,
    ServiceName        String,
    Body               String,
    ResourceSchemaUrl  String,
    ResourceAttributes Nested(keys String, values String),
    ScopeSchemaUrl     String,
    ScopeName          String,
    ScopeVersion       String,
    ScopeAttributes    Nested(keys String, values String),
    LogAttributes      Nested(keys String, values String),
    EventName          String,
    Received           DateTime DEFAULT now()
)
ENGINE = MergeTree
PARTITION BY toDate(Received)
ORDER BY (ServiceName, Received);

-- `time` has whole seconds; `milliseconds` has the rest.
CREATE TABLE IF NOT EXISTS hublink.events_store
(
    uid            String,
    time           DateTime('UTC'),
    milliseconds   UInt16,
    received       DateTime('UTC'),
    source         String,
    module         String,
    event          String,
    user           String,
    suite_version  String,
    outbox         String,
    sequence       UInt64,
    row            Int64,
    module_name    String,
    module_version String,
    os             String,
    os_name        String,
    data           Nested(keys String, values String),
    resource       Nested(keys String, values String),
    body           String
)
ENGINE = ReplacingMergeTree
PARTITION BY if(toYear(time) BETWEEN 2020 AND 2039, toYYYYMM(time), 0)
ORDER BY (module, event, uid);

-- An attribute that is missing has index 0, and there is an empty text. What `reportctl outbox test` sends is
-- no event.
CREATE MATERIALIZED VIEW IF NOT EXISTS hublink.otel_logs_to_events TO hublink.events_store AS
SELECT
    LogAttributes.values[indexOf(LogAttributes.keys, 'log.record.uid')] AS uid,
    toDateTime(substring(Timestamp, 1, 19), 'UTC') AS time,
    toUInt16OrZero(substring(Timestamp, 21, 3)) AS milliseconds,
    Received AS received,
    if(has(LogAttributes.keys, 'hublink.source'),
       LogAttributes.values[indexOf(LogAttributes.keys, 'hublink.source')], 'outbox') AS source,
    LogAttributes.values[indexOf(LogAttributes.keys, 'metrik.module')] AS module,
    LogAttributes.values[indexOf(LogAttributes.keys, 'metrik.event')] AS event,
    LogAttributes.values[indexOf(LogAttributes.keys, 'user.id')] AS user,
    LogAttributes.values[indexOf(LogAttributes.keys, 'hublink.version')] AS suite_version,
    ResourceAttributes.values[indexOf(ResourceAttributes.keys, 'metrik.outbox.id')] AS outbox,
    toUInt64OrZero(LogAttributes.values[indexOf(LogAttributes.keys, 'metrik.sequence')]) AS sequence,
    toInt64OrZero(LogAttributes.values[indexOf(LogAttributes.keys, 'hublink.row')]) AS row,
    ServiceName AS module_name,
    ResourceAttributes.values[indexOf(ResourceAttributes.keys, 'service.version')] AS module_version,
    ResourceAttributes.values[indexOf(ResourceAttributes.keys, 'os.type')] AS os,
    ResourceAttributes.values[indexOf(ResourceAttributes.keys, 'os.description')] AS os_name,
    arrayMap(name -> substring(name, 13),
             arrayFilter(name -> substring(name, 1, 12) = 'metrik.data.', LogAttributes.keys)) AS `data.keys`,
    arrayFilter((value, name) -> substring(name, 1, 12) = 'metrik.data.',
                LogAttributes.values, LogAttributes.keys) AS `data.values`,
    arrayFilter(name -> name NOT IN ('service.name', 'service.version', 'metrik.outbox.id', 'os.type',
                                     'os.description'),
                ResourceAttributes.keys) AS `resource.keys`,
    arrayFilter((value, name) -> name NOT IN ('service.name', 'service.version', 'metrik.outbox.id',
                                              'os.type', 'os.description'),
                ResourceAttributes.values, ResourceAttributes.keys) AS `resource.values`,
    Body AS body
FROM hublink.otel_logs
WHERE uid != ''
    AND ResourceAttributes.values[indexOf(ResourceAttributes.keys, 'service.namespace')] = 'hublink'
    AND outbox != 'reportctl-test';

CREATE VIEW IF NOT EXISTS hublink.events AS SELECT * FROM hublink.events_store FINAL;

CREATE TABLE IF NOT EXISTS hublink.events_per_day
(
    day           Date,
    module        String,
    event         String,
    suite_version String,
    events        AggregateFunction(uniq, String),
    users         AggregateFunction(uniq, String),
    installations AggregateFunction(uniq, String)
)
ENGINE = AggregatingMergeTree
PARTITION BY if(toYear(day) BETWEEN 2020 AND 2039, toYear(day), 0)
ORDER BY (day, module, event, suite_version);

-- In this engine, a view is not fed by what another view writes. So this one reads the rows, too.
CREATE MATERIALIZED VIEW IF NOT EXISTS hublink.events_to_days TO hublink.events_per_day AS
SELECT
    toDate(toDateTime(substring(Timestamp, 1, 19), 'UTC'), 'UTC') AS day,
    LogAttributes.values[indexOf(LogAttributes.keys, 'metrik.module')] AS module,
    LogAttributes.values[indexOf(LogAttributes.keys, 'metrik.event')] AS event,
    LogAttributes.values[indexOf(LogAttributes.keys, 'hublink.version')] AS suite_version,
    uniqState(LogAttributes.values[indexOf(LogAttributes.keys, 'log.record.uid')]) AS events,
    uniqStateIf(LogAttributes.values[indexOf(LogAttributes.keys, 'user.id')],
                LogAttributes.values[indexOf(LogAttributes.keys, 'user.id')] NOT IN ('', 'visitor')) AS users,
    uniqState(ResourceAttributes.values[indexOf(ResourceAttributes.keys, 'metrik.outbox.id')])
        AS installations
FROM hublink.otel_logs
WHERE has(LogAttributes.keys, 'log.record.uid')
    AND ResourceAttributes.values[indexOf(ResourceAttributes.keys, 'service.namespace')] = 'hublink'
    AND NOT has(ResourceAttributes.values, 'reportctl-test')
GROUP BY day, module, event, suite_version;

-- This engine takes an object in `value` only as a text; docs/Analytics.md says how to load an export.
CREATE TABLE IF NOT EXISTS hublink.reports_store
(
    source        String,
    id            Int64,
    at            Nullable(String),
    event         Nullable(String),
    module        Nullable(String),
    action        Nullable(String),
    value         Nullable(String),
    openid        Nullable(String),
    suite_version Nullable(String),
    create_time   Nullable(String)
)
ENGINE = ReplacingMergeTree
ORDER BY (source, id);

CREATE VIEW IF NOT EXISTS hublink.reports AS SELECT * FROM hublink.reports_store FINAL;
