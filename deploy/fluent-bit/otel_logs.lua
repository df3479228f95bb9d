-- Turns a log record, as fluent-bit's opentelemetry input hands it over, into a row of hublink.otel_logs.
--
-- fluent-bit gives numbers to Lua as doubles: a whole number beyond 2^53 loses its last digits here, and not
-- in the collector.

local ESCAPES = {
    ['"'] = '\\"', ['\\'] = '\\\\', ['\b'] = '\\b', ['\f'] = '\\f',
    ['\n'] = '\\n', ['\r'] = '\\r', ['\t'] = '\\t',
}

local function json_text(text)
    return '"' .. text:gsub('[%c"\\]', function(char)
        return ESCAPES[char] or string.format('\\u%04x', char:byte())
    end) .. '"'
end

local function number_text(number)
    if number == math.floor(number) and math.abs(number) < 2 ^ 63 then
        return string.format('%.0f', number)
    end
    local short = string.format('%.15g', number)
    return tonumber(short) == number and short or string.format('%.17g', number)
end

local json

local function json_list(list)
    local parts = {}
    for index, value in ipairs(list) do
        parts[index] = json(value)
    end
    return '[' .. table.concat(parts, ',') .. ']'
end

local function json_object(object)
    local names = {}
    for name in pairs(object) do
        names[#names + 1] = name
    end
    table.sort(names)
    for index, name in ipairs(names) do
        names[index] = json_text(name) .. ':' .. json(object[name])
    end
    return '{' .. table.concat(names, ',') .. '}'
end

-- A list that is empty cannot be told from an object that is; it is written as an object.
function json(value)
    local kind = type(value)
    if kind == 'table' then
        return #value > 0 and json_list(value) or json_object(value)
    elseif kind == 'string' then
        return json_text(value)
    elseif kind == 'number' then
        return number_text(value)
    elseif kind == 'boolean' then
        return tostring(value)
    end
    return 'null'
end

-- A value as the exporter writes one: a text as it is, everything else as JSON.
local function text_of(value)
    if value == nil then
        return ''
    end
    return type(value) == 'string' and value or json(value)
end

local function texts_of(attributes)
    local texts = {}
    for name, value in pairs(attributes or {}) do
        texts[name] = text_of(value)
    end
    return texts
end

local function time_text(timestamp)
    return os.date('!%Y-%m-%d %H:%M:%S', timestamp.sec) .. string.format('.%09d', timestamp.nsec)
end

function otel_logs_row(tag, timestamp, group, metadata, record)
    local resource = group.resource or {}
    local scope = group.scope or {}
    local log = metadata.otlp or {}
    return 1, timestamp, metadata, {
        Timestamp = time_text(timestamp),
        SeverityText = log.severity_text or '',
        SeverityNumber = log.severity_number or 0,
        ServiceName = text_of((resource.attributes or {})['service.name']),
        Body = text_of(record.body),
        ResourceSchemaUrl = resource.schema_url or '',
        ResourceAttributes = texts_of(resource.attributes),
        ScopeSchemaUrl = scope.schema_url or '',
        ScopeName = scope.name or '',
        ScopeVersion = scope.version or '',
        LogAttributes = texts_of(log.attributes),
        EventName = log.event_name or '',
    }
end
