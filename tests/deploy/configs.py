"""The collector's and fluent-bit's configurations, as far as they can be checked without the programs: they
are YAML, name only options that their documentation lists, and use what they define."""
import yaml


def options(names, **parts):
    """The options of a component: those with a value, and those with options of their own."""
    return {**dict.fromkeys(names.split()), **parts}


# What each component's documentation lists, as far as it is of use here.
BATCH = options("flush_timeout min_size max_size sizer")
QUEUE = options(
    "enabled storage num_consumers queue_size block_on_overflow wait_for_result sizer", batch=BATCH
)
BACKOFF = options(
    "enabled initial_interval max_interval max_elapsed_time multiplier randomization_factor"
)
SASL = options("username password mechanism")
KAFKA = options(
    "brokers protocol_version client_id timeout",
    tls=options("insecure ca_file"),
    auth=options("", sasl=SASL),
)
COMPACTION = options("directory on_start on_rebound cleanup_on_start")
OTLP = options(
    "endpoint max_request_body_size",
    auth=options("authenticator"),
    tls=options("cert_file key_file"),
)
CLICKHOUSE = options(
    "endpoint username password database logs_table_name create_schema async_insert compress timeout",
    connection_params=options("max_partitions_per_insert_block"),
    sending_queue=QUEUE,
    retry_on_failure=BACKOFF,
)
TO_KAFKA = {
    **KAFKA,
    "logs": options("topic encoding"),
    "producer": options("required_acks compression max_message_bytes allow_auto_topic_creation"),
    "sending_queue": QUEUE,
    "retry_on_failure": BACKOFF,
}
FROM_KAFKA = {
    **KAFKA,
    **options("group_id initial_offset"),
    "logs": options("topics encoding"),
    "message_marking": options("after on_error"),
    "error_backoff": BACKOFF,
}
COLLECTOR = {
    "extensions": {
        "bearertokenauth": options("scheme token filename"),
        "file_storage": options("directory create_directory timeout fsync", compaction=COMPACTION),
    },
    "receivers": {"otlp": {"protocols": {"http": OTLP}}, "kafka": FROM_KAFKA},
    "processors": {"memory_limiter": options("check_interval limit_percentage spike_limit_percentage")},
    "exporters": {"clickhouse": CLICKHOUSE, "kafka": TO_KAFKA},
    "service": options("extensions", pipelines={"logs": options("receivers processors exporters")}),
}

FLUENT_BIT = {
    "service": options(
        "flush log_level storage.path storage.sync storage.max_chunks_up storage.backlog.mem_limit"
    ),
    "opentelemetry": options(
        "name listen port tag tag_from_uri successful_response_code buffer_max_size logs_body_key"
        " storage.type tls tls.crt_file tls.key_file",
        processors=options("logs"),
    ),
    "lua": options("name script call time_as_table"),
    "http": options(
        "name match host port tls uri format json_date_key compress http_user http_passwd retry_limit"
    ),
    "kafka": options(
        "name match brokers topics format queue_full_retries retry_limit rdkafka.security.protocol"
        " rdkafka.sasl.mechanism rdkafka.sasl.username rdkafka.sasl.password"
        " rdkafka.request.required.acks rdkafka.compression.codec"
    ),
}


def unknown(given, known, path=""):
    """The options that are not known, each with its path."""
    if known is None or not isinstance(given, dict):
        return [path] if known is not None else []
    found = []
    for name, value in given.items():
        here = f"{path}/{name}"
        found += unknown(value, known[name], here) if name in known else [here]
    return found


def named_and_defined(configuration):
    """The components that the service names, and those that are defined."""
    service = configuration["service"]
    pipeline = service["pipelines"]["logs"]
    named = {("extensions", each) for each in service["extensions"]}
    named |= {(kind, each) for kind, components in pipeline.items() for each in components}
    kinds = [kind for kind in configuration if kind != "service"]
    return named, {(kind, each) for kind in kinds for each in configuration[kind]}


def check_collector(path, expect):
    configuration = yaml.safe_load(path.read_text())
    expect(f"{path.name}: unknown options", unknown(configuration, COLLECTOR), [])
    named, defined = named_and_defined(configuration)
    expect(f"{path.name}: what it uses", named, defined)
    for exporter in configuration["exporters"].values():
        expect(f"{path.name}: it tries for ever", exporter["retry_on_failure"]["max_elapsed_time"], "0s")
        on_disk = exporter["sending_queue"]["storage"] in configuration["extensions"]
        expect(f"{path.name}: what waits is on the disk", on_disk, True)


def check_fluent_bit(path, expect):
    configuration = yaml.safe_load(path.read_text())
    (source,), (output,) = configuration["pipeline"]["inputs"], configuration["pipeline"]["outputs"]
    (script,) = source["processors"]["logs"]
    for part in (configuration["service"], source, script, output):
        known = FLUENT_BIT[part.get("name", "service")]
        expect(f"{path.name}: unknown options", unknown(part, known), [])
    signature = f"function {script['call']}(tag, timestamp, group, metadata, record)"
    expect(f"{path.name}: its function", signature in (path.parent / script["script"]).read_text(), True)
    expect(f"{path.name}: its tag", output["match"], source["tag"])
    expect(f"{path.name}: it tries for ever", output["retry_limit"], "no_limits")
    expect(f"{path.name}: what waits is on the disk", source["storage.type"], "filesystem")


def connection_settings(deploy):
    """What the exporter tells ClickHouse with each INSERT."""
    configuration = yaml.safe_load((deploy / "collector/clickhouse.yaml").read_text())
    return configuration["exporters"]["clickhouse"]["connection_params"]


def check(deploy, expect):
    for path in sorted((deploy / "collector").glob("*.yaml")):
        check_collector(path, expect)
    for path in sorted((deploy / "fluent-bit").glob("*.yaml")):
        check_fluent_bit(path, expect)
