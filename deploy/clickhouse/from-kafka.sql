-- Reads the topic that ../fluent-bit/kafka.yaml writes, into the tables of events.sql. Put the names of your
-- brokers into it and run it once, after events.sql:
--
--     clickhouse-client --multiquery < from-kafka.sql
--
-- How the server logs in to the brokers stands in its own configuration:
--
--     <kafka>
--         <security_protocol>sasl_ssl</security_protocol>
--         <sasl_mechanism>SCRAM-SHA-512</sasl_mechanism>
--         <sasl_username>hublink</sasl_username>
--         <sasl_password>...</sasl_password>
--     </kafka>
--
-- The collector's topic has another form; ../collector/kafka-to-clickhouse.yaml reads that.

CREATE TABLE IF NOT EXISTS hublink.rows_topic
(
    Timestamp          DateTime64(9),
    SeverityText       String,
    SeverityNumber     UInt8,
    ServiceName        String,
    Body               String,
    ResourceSchemaUrl  String,
    ResourceAttributes Map(String, String),
    ScopeSchemaUrl     String,
    ScopeName          String,
    ScopeVersion       String,
    LogAttributes      Map(String, String),
    EventName          String
)
ENGINE = Kafka
SETTINGS
    kafka_broker_list = 'kafka.example:9093',
    kafka_topic_list = 'hublink.rows',
    kafka_group_name = 'hublink-clickhouse',
    kafka_format = 'JSONEachRow',
    -- fluent-bit adds a time of its own.
    input_format_skip_unknown_fields = 1;

-- The place in the topic moves on once these rows are written. Rows that are read again make no second event.
CREATE MATERIALIZED VIEW IF NOT EXISTS hublink.rows_topic_to_otel_logs TO hublink.otel_logs AS
SELECT *
FROM hublink.rows_topic;
