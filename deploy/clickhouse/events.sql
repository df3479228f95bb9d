-- The events of a fleet as tables, for ClickHouse 24.3 and later (tested with 26.7). Run it once, before the
-- collector starts:
--
--     clickhouse-client --multiquery < events.sql
--
-- otel_logs takes the rows that the collector (or fluent-bit) writes. A view turns each row into a line of
-- the wide table, and a second view adds that line to the sums of its day. Analysts read `events` and
-- `events_per_day`.

CREATE DATABASE IF NOT EXISTS hublink;

-- The columns of the collector's exporter, by name and type, and one of ours. They are partitioned by the
-- time of arrival, because a desktop's clock may be wrong by years, and each wrong day would be a partition
-- of its own. They are kept for a week, to look at when something is odd.
CREATE TABLE IF NOT EXISTS hublink.otel_logs
(
    Timestamp          DateTime64(9) CODEC(Delta(8), ZSTD(1)),
    TraceId            String CODEC(ZSTD(1)),
    SpanId             String CODEC(ZSTD(1)),
    TraceFlags         UInt8,
    SeverityText       LowCardinality(String) CODEC(ZSTD(1)),
    SeverityNumber     UInt8,
    ServiceName        LowCardinality(String) CODEC(ZSTD(1)),
    Body               String CODEC(ZSTD(1)),
    ResourceSchemaUrl  LowCardinality(String) CODEC(ZSTD(1)),
    ResourceAttributes Map(LowCardinality(String), String) CODEC(ZSTD(1)),
    ScopeSchemaUrl     LowCardinality(String) CODEC(ZSTD(1)),
    ScopeName          String CODEC(ZSTD(1)),
    ScopeVersion       LowCardinality(String) CODEC(ZSTD(1)),
    ScopeAttributes    Map(LowCardinality(String), String) CODEC(ZSTD(1)),
    LogAttributes      Map(LowCardinality(String), String) CODEC(ZSTD(1)),
    EventName          String CODEC(ZSTD(1)),
    Received           DateTime DEFAULT now()
)
ENGINE = MergeTree
PARTITION BY toDate(Received)
ORDER BY (ServiceName, Received)
TTL Received + INTERVAL 7 DAY
SETTINGS ttl_only_drop_parts = 1;

-- The wide table. An event may arrive twice: both lines have the same key, and the engine keeps one of them
-- when it merges. Until then the view `events` leaves the second one out. The time is not in the key: a row
-- of the local store that has none gets the time of each sending. The ids of the other events begin with
-- their time, so lines of one time lie together all the same. Months before 2020 and after 2039 are wrong
-- clocks, and share a partition.
CREATE TABLE IF NOT EXISTS hublink.events_store
(
    uid            String CODEC(ZSTD(1)),
    time           DateTime64(3, 'UTC') CODEC(Delta(8), ZSTD(1)),
    received       DateTime('UTC') CODEC(Delta(4), ZSTD(1)),
    source         LowCardinality(String),
    module         LowCardinality(String),
    event          LowCardinality(String),
    user           String CODEC(ZSTD(1)),
    suite_version  LowCardinality(String),
    outbox         String CODEC(ZSTD(1)),
    sequence       UInt64 CODEC(Delta(8), ZSTD(1)),
    row            Int64 CODEC(Delta(8), ZSTD(1)),
    module_name    LowCardinality(String),
    module_version LowCardinality(String),
    os             LowCardinality(String),
    os_name        LowCardinality(String),
    data           Map(LowCardinality(String), String) CODEC(ZSTD(1)),
    resource       Map(LowCardinality(String), String) CODEC(ZSTD(1)),
    body           String CODEC(ZSTD(1))
)
ENGINE = ReplacingMergeTree
PARTITION BY if(toYear(time) BETWEEN 2020 AND 2039, toYYYYMM(time), 0)
ORDER BY (module, event, uid);

-- No function here may fail: the exporter's INSERT would fail with it, for all rows of the batch and for
-- ever. What `reportctl outbox test` sends is no event.
CREATE MATERIALIZED VIEW IF NOT EXISTS hublink.otel_logs_to_events TO hublink.events_store AS
SELECT
    LogAttributes['log.record.uid'] AS uid,
    toDateTime64(Timestamp, 3, 'UTC') AS time,
    Received AS received,
    if(LogAttributes['hublink.source'] = '', 'outbox', LogAttributes['hublink.source']) AS source,
    LogAttributes['metrik.module'] AS module,
    LogAttributes['metrik.event'] AS event,
    LogAttributes['user.id'] AS user,
    LogAttributes['hublink.version'] AS suite_version,
    ResourceAttributes['metrik.outbox.id'] AS outbox,
    toUInt64OrZero(LogAttributes['metrik.sequence']) AS sequence,
    toInt64OrZero(LogAttributes['hublink.row']) AS row,
    ServiceName AS module_name,
    ResourceAttributes['service.version'] AS module_version,
    ResourceAttributes['os.type'] AS os,
    ResourceAttributes['os.description'] AS os_name,
    mapApply((name, value) -> (substring(name, 13), value),
             mapFilter((name, value) -> startsWith(name, 'metrik.data.'), LogAttributes)) AS data,
    mapFilter((name, value) -> name NOT IN ('service.name', 'service.version', 'metrik.outbox.id', 'os.type',
                                            'os.description'), ResourceAttributes) AS resource,
    Body AS body
FROM hublink.otel_logs
WHERE LogAttributes['log.record.uid'] != ''
    AND ResourceAttributes['service.namespace'] = 'hublink'
    AND ResourceAttributes['metrik.outbox.id'] != 'reportctl-test';

-- Each event once.
CREATE VIEW IF NOT EXISTS hublink.events AS SELECT * FROM hublink.events_store FINAL;

-- Each day's sums, for charts over years. They count different ids, so that an event that arrives twice
-- counts once. Read them with uniqMerge(events), uniqMerge(users) and uniqMerge(installations): exact up to
-- some 60,000, then to about 1 %.
CREATE TABLE IF NOT EXISTS hublink.events_per_day
(
    day           Date,
    module        LowCardinality(String),
    event         LowCardinality(String),
    suite_version LowCardinality(String),
    events        AggregateFunction(uniq, String),
    users         AggregateFunction(uniq, String),
    installations AggregateFunction(uniq, String)
)
ENGINE = AggregatingMergeTree
PARTITION BY if(toYear(day) BETWEEN 2020 AND 2039, toYear(day), 0)
ORDER BY (day, module, event, suite_version);

CREATE MATERIALIZED VIEW IF NOT EXISTS hublink.events_to_days TO hublink.events_per_day AS
SELECT
    toDate(time) AS day,
    module,
    event,
    suite_version,
    uniqState(uid) AS events,
    uniqStateIf(user, user NOT IN ('', 'visitor')) AS users,
    uniqState(outbox) AS installations
FROM hublink.events_store
GROUP BY day, module, event, suite_version;

-- What `reportctl export --format jsonl` writes, with the name of the installation that it comes from. A row
-- that is loaded twice has the same key; `reports` shows it once. `at` is a text of up to the year 9999, so
-- `time` is 1970 where the text is no time that the engine knows.
CREATE TABLE IF NOT EXISTS hublink.reports_store
(
    source        LowCardinality(String),
    id            Int64,
    at            String CODEC(ZSTD(1)),
    event         String CODEC(ZSTD(1)),
    module        LowCardinality(String),
    action        String CODEC(ZSTD(1)),
    value         String CODEC(ZSTD(1)),
    openid        String CODEC(ZSTD(1)),
    suite_version LowCardinality(String),
    create_time   String CODEC(ZSTD(1)),
    time          DateTime64(3, 'UTC') MATERIALIZED parseDateTime64BestEffortOrZero(at, 3, 'UTC')
)
ENGINE = ReplacingMergeTree
ORDER BY (source, id);

CREATE VIEW IF NOT EXISTS hublink.reports AS SELECT *, time FROM hublink.reports_store FINAL;
