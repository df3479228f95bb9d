"""Runs deploy/fluent-bit/otel_logs.lua on log records, in the form in which fluent-bit hands them over."""
import subprocess
import tempfile

import rows

# Prints each column of a row, and each member of a column that is a map; the value in hexadecimal digits.
PRINT = """
local function hex(value)
    return (tostring(value):gsub('.', function(char) return string.format('%02x', char:byte()) end))
end
for index, each in ipairs(records) do
    local code, _, _, row = otel_logs_row('hublink', each.timestamp, each.group, each.metadata, each.record)
    assert(code == 1)
    for name, value in pairs(row) do
        if type(value) == 'table' then
            for member, text in pairs(value) do
                print(index .. ' ' .. name .. ' ' .. member .. ' ' .. hex(text))
            end
        else
            print(index .. ' ' .. name .. ' ' .. hex(value))
        end
    end
end
"""


def literal(value):
    if isinstance(value, dict):
        return "{" + ",".join(f"[{literal(key)}]={literal(each)}" for key, each in value.items()) + "}"
    if isinstance(value, list):
        return "{" + ",".join(map(literal, value)) + "}"
    if isinstance(value, str):
        return '"' + "".join(f"\\{byte:03}" for byte in value.encode()) + '"'
    if value is None or isinstance(value, bool):
        return "nil" if value is None else str(value).lower()
    return repr(value)


def attributes(each):
    return {one["key"]: rows.raw(one["value"]) for one in each}


def handed_over(resource_logs, scope_logs, record):
    seconds, nanoseconds = divmod(int(record["timeUnixNano"]), rows.SECOND)
    return {
        "timestamp": {"sec": seconds, "nsec": nanoseconds},
        "group": {
            "resource": {
                "attributes": attributes(resource_logs["resource"]["attributes"]),
                "schema_url": resource_logs["schemaUrl"],
            },
            "scope": {**scope_logs["scope"], "schema_url": scope_logs["schemaUrl"]},
        },
        "metadata": {
            "otlp": {
                "severity_number": record["severityNumber"],
                "severity_text": record["severityText"],
                "attributes": attributes(record["attributes"]),
                "event_name": record["eventName"],
            }
        },
        "record": {"body": rows.raw(record["body"])},
    }


def run(script, records):
    """The rows that the script makes of the records: the columns that it sets, all as texts."""
    with tempfile.NamedTemporaryFile("w", suffix=".lua") as program:
        lists = literal([handed_over(*each) for each in records])
        program.write(f"dofile('{script}')\nlocal records = {lists}\n{PRINT}")
        program.flush()
        ended = subprocess.run(["luajit", program.name], check=True, stdout=subprocess.PIPE, text=True)
    made = [{} for _ in records]
    for line in ended.stdout.splitlines():
        index, name, *member, value = line.split(" ")
        row = made[int(index) - 1]
        value = bytes.fromhex(value).decode()
        if member:
            row.setdefault(name, {})[" ".join(member)] = value
        else:
            row[name] = value
    return made
