"""Log records as rows of otel_logs, as the collector's ClickHouse exporter writes them.

Every value becomes a text: a text as it is, everything else as JSON, with sorted keys and with <, > and &
escaped. Each map has its values as texts. A record without a time has the time at which it was observed.
"""
import datetime
import json

SECOND = 1_000_000_000


def raw(value):
    """An AnyValue of the protocol as the value that it stands for."""
    if "intValue" in value:
        return int(value["intValue"])
    if "doubleValue" in value:
        number = float(value["doubleValue"])
        return int(number) if number.is_integer() and abs(number) < 1e21 else number  # 3, not 3.0
    if "kvlistValue" in value:
        return {each["key"]: raw(each["value"]) for each in value["kvlistValue"].get("values", [])}
    if "arrayValue" in value:
        return [raw(each) for each in value["arrayValue"].get("values", [])]
    return next(iter(value.values()), None)


def json_text(value):
    text = json.dumps(value, ensure_ascii=False, sort_keys=True, separators=(",", ":"))
    return text.replace("<", "\\u003c").replace(">", "\\u003e").replace("&", "\\u0026")


def text(value):
    value = raw(value)
    if value is None:
        return ""
    return value if isinstance(value, str) else json_text(value)


def texts(attributes):
    return {each["key"]: text(each["value"]) for each in attributes}


def time_text(nanoseconds):
    seconds, rest = divmod(int(nanoseconds), SECOND)
    time = datetime.datetime(1970, 1, 1) + datetime.timedelta(seconds=seconds)
    return f"{time:%Y-%m-%d %H:%M:%S}.{rest:09}"


def row(resource_logs, scope_logs, record):
    resource = texts(resource_logs["resource"]["attributes"])
    scope = scope_logs["scope"]
    return {
        "Timestamp": time_text(record.get("timeUnixNano") or record["observedTimeUnixNano"]),
        "TraceId": record.get("traceId", ""),
        "SpanId": record.get("spanId", ""),
        "TraceFlags": record.get("flags", 0),
        "SeverityText": record["severityText"],
        "SeverityNumber": record["severityNumber"],
        "ServiceName": resource["service.name"],
        "Body": text(record["body"]),
        "ResourceSchemaUrl": resource_logs["schemaUrl"],
        "ResourceAttributes": resource,
        "ScopeSchemaUrl": scope_logs["schemaUrl"],
        "ScopeName": scope["name"],
        "ScopeVersion": scope["version"],
        "ScopeAttributes": texts(scope.get("attributes", [])),
        "LogAttributes": texts(record["attributes"]),
        "EventName": record["eventName"],
    }


def records(request):
    """Each log record of a request, with what it lies in."""
    for resource_logs in request["resourceLogs"]:
        for scope_logs in resource_logs["scopeLogs"]:
            for record in scope_logs["logRecords"]:
                yield resource_logs, scope_logs, record
