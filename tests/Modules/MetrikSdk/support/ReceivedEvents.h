#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include <rapidjson/document.h>

/// An event as a collector sees it.
struct ReceivedEvent {
    std::string uuid;
    std::string module;
    std::int64_t sequence = 0;
    int number = -1; ///< The number in its payload: see NumberedPayload.
};

/// A payload as the service makes it. `number` identifies it.
inline std::string NumberedPayload(int number) {
    return R"({"extend":{"hublinkVersion":"5.1.0.2","createTime":"1700000000123"},"eventData":{"number":)" +
           std::to_string(number) + R"(,"openid":"u1","sys_version":"Debian GNU/Linux 12"}})";
}

namespace ReceivedEventsDetail {

/// The value of `key` in a list of keys and values; a null value when there is none.
inline const rapidjson::Value& Find(const rapidjson::Value& list, const char* key) {
    static const rapidjson::Value none;
    for (const auto& entry : list.GetArray())
        if (entry["key"] == key)
            return entry["value"];
    return none;
}

inline ReceivedEvent Read(const rapidjson::Value& record) {
    ReceivedEvent event;
    event.module = Find(record["attributes"], "metrik.module")["stringValue"].GetString();
    event.uuid = Find(record["attributes"], "log.record.uid")["stringValue"].GetString();
    event.sequence = std::stoll(Find(record["attributes"], "metrik.sequence")["intValue"].GetString());
    if (record["body"].HasMember("kvlistValue")) {
        const auto& data = Find(record["body"]["kvlistValue"]["values"], "eventData");
        const auto& number = Find(data["kvlistValue"]["values"], "number");
        event.number = std::stoi(number["intValue"].GetString());
    }
    return event;
}

} // namespace ReceivedEventsDetail

/// The events of a request's body, in order.
inline std::vector<ReceivedEvent> EventsOf(const std::string& body) {
    rapidjson::Document document;
    document.Parse(body.data(), body.size());
    std::vector<ReceivedEvent> events;
    for (const auto& resource : document["resourceLogs"].GetArray())
        for (const auto& scope : resource["scopeLogs"].GetArray())
            for (const auto& record : scope["logRecords"].GetArray())
                events.push_back(ReceivedEventsDetail::Read(record));
    return events;
}
