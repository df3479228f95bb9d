// Modules, events and a collector's answers through the analytics SDK and its own outbox, with any content.
// Each accepted event must be counted in exactly one place. Each request must be one that a collector can
// read, and each event must keep one id and one number.
//
// An input is a list of steps, with a zero byte after each. The first character says what the step is. Line
// ends separate the texts of a step:

#include <filesystem>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include <SQLiteCpp/SQLiteCpp.h>
#include <rapidjson/document.h>

#include "Modules/MetrikSdk/Sdk.h"
#include "Modules/MetrikSdk/upload/UploadCycle.h"
#include "SystemTool/Text/Utf8.h"
#include "fuzz/support/Require.h"
#include "tests/support/TemporaryDirectory.h"

using namespace MetrikSdk;

namespace {

void OnFailure(std::string what, std::string why) {
    Require(!what.empty() && !why.empty(), "a failure has a cause and a text", what);
}

void OnSuccess(std::string what, std::string /*detail*/) { // the detail is a module's id and may be empty
    Require(!what.empty(), "a success has a name");
}

std::vector<std::string> Parted(const std::string& text, char mark) {
    std::vector<std::string> parts;
    for (std::size_t at = 0; at <= text.size();) {
        const auto end = std::min(text.find(mark, at), text.size());
        parts.push_back(text.substr(at, end - at));
        at = end + 1;
    }
    return parts;
}

/// The collector. It reads each request and checks it.
class Collector final : public otlp::Sender {
public:
    otlp::HttpResult Post(const std::string& body) override {
        rapidjson::Document request;
        request.Parse<rapidjson::kParseValidateEncodingFlag | rapidjson::kParseIterativeFlag>(body.data(),
                                                                                              body.size());
        Require(!request.HasParseError(), "a request is JSON in UTF-8", body);
        std::size_t events = 0;
        for (const auto& resource : request["resourceLogs"].GetArray())
            for (const auto& scope : resource["scopeLogs"].GetArray())
                events += Read(scope["logRecords"]);
        Require(events > 0 && events <= 512, "a request has some events", std::to_string(events));
        return answer;
    }
    void Abandon() override {}
    std::string Destination() const override { return "http://collector"; }
    std::vector<std::string> HeaderNames() const override { return {}; }

    /// The ids of the modules that announced themselves, as a collector gets them.
    std::set<std::string> modules;
    otlp::HttpResult answer;

private:
    static const rapidjson::Value& ValueOf(const rapidjson::Value& holder, const char* key) {
        for (const auto& attribute : holder["attributes"].GetArray())
            if (attribute["key"] == key)
                return attribute["value"];
        Require(false, "an attribute is there", key);
        return holder;
    }
    static std::string TextOf(const rapidjson::Value& holder, const char* key) {
        const auto& text = ValueOf(holder, key)["stringValue"];
        return {text.GetString(), text.GetStringLength()};
    }

    std::size_t Read(const rapidjson::Value& records) {
        const auto module = TextOf(records[0], "metrik.module");
        Require(modules.contains(module), "an event is of a module that announced itself", module);
        std::int64_t before = 0;
        for (const auto& record : records.GetArray()) {
            const auto uuid = TextOf(record, "log.record.uid");
            const std::int64_t sequence =
                std::stoll(ValueOf(record, "metrik.sequence")["intValue"].GetString());
            Require(sequence > before, "a module's events come in their order", std::to_string(sequence));
            before = sequence;
            const auto known = m_numbers.emplace(uuid, std::pair(module, sequence)).first->second;
            Require(known == std::pair(module, sequence),
                    "an event keeps its number however often it is sent", uuid);
            const auto id = m_uuids.emplace(std::pair(module, sequence), uuid).first->second;
            RequireEqual(id, uuid, "a number is one event's");
            Require(record.HasMember("body") && record.HasMember("timeUnixNano"),
                    "an event has a body and a time");
        }
        return records.Size();
    }

    std::map<std::string, std::pair<std::string, std::int64_t>> m_numbers;
    std::map<std::pair<std::string, std::int64_t>, std::string> m_uuids;
};

/// The SDK as in a process that has just started, with an empty data directory.
class Process {
public:
    Process() { Announce({"A759", "1", "default", ""}); }

    void Do(const std::string& step) {
        const auto parts = Parted(step.substr(1), '\n');
        const auto part = [&](std::size_t i) { return i < parts.size() ? parts[i] : std::string(); };
        switch (step.front()) {
        case 'm':
            return Announce({part(0), part(1), part(2), part(3)});
        case 'a':
            return Pass(AnswerOf(parts));
        case 'f':
            return Pass(NoAnswer(part(0)));
        default:
            m_accepted += m_modules.back()->ReportEvent(part(0), Behind(parts, 1)) ? 1 : 0;
        }
    }

    void RequireEachEventInOnePlace() {
        const auto status = m_engine->Events().Status();
        RequireEqual(status.stored, m_accepted, "what was accepted is stored");
        RequireEqual(status.delivered + status.refused + status.deadLettered + status.dropped +
                         status.waiting,
                     status.stored, "an event is in one place");
        SQLite::Database file(Directory() + "/MetrikOutbox.db", SQLite::OPEN_READWRITE, 5000);
        const auto ask = [&](const char* query) { return file.execAndGet(query).getInt64(); };
        RequireEqual(ask("SELECT count(*) FROM event"), status.waiting,
                     "the counter of waiting events is true");
        RequireEqual(ask("SELECT coalesce(sum(bytes), 0) FROM event"), status.waitingBytes,
                     "so are their bytes");
        RequireEqual(ask("SELECT count(*) FROM dead_letter"), status.deadLetters,
                     "and that of the dead letters");
        RequireEqual(file.execAndGet("PRAGMA integrity_check").getString(), std::string("ok"),
                     "the file is sound");
    }

    /// Requires that only directories and outboxes are made.
    void RequireOutboxesOnly() {
        for (const auto& entry : std::filesystem::recursive_directory_iterator(m_home.Path()))
            Require(entry.is_directory() || entry.path().filename().string().starts_with("MetrikOutbox.db"),
                    "no other file is made", entry.path().string());
    }

private:
    static constexpr std::size_t MAX_MODULES = 64; ///< So that an input does not take long.

    std::string Directory() const { return m_home.Path() + "/hublink/database"; }

    static std::string Behind(const std::vector<std::string>& parts, std::size_t first) {
        std::string text;
        for (std::size_t i = first; i < parts.size(); ++i)
            text += (i > first ? "\n" : "") + parts[i];
        return text;
    }

    static otlp::HttpResult AnswerOf(const std::vector<std::string>& parts) {
        otlp::HttpResult answer;
        answer.status = std::strtol(parts.front().substr(0, 3).c_str(), nullptr, 10);
        answer.retryAfter = parts.size() > 1 ? parts[1] : "";
        answer.contentType = parts.size() > 2 ? parts[2] : "";
        answer.body = Behind(parts, 3);
        return answer;
    }

    static otlp::HttpResult NoAnswer(const std::string& reason) {
        otlp::HttpResult answer;
        answer.fault = "no answer: " + reason;
        answer.began = reason.starts_with("late");
        return answer;
    }

    struct Announcement {
        std::string id, version, name, directory;
    };

    /// A directory that the input names is always below the data directory, because the target may run as
    /// root, which could use other directories. Events in such a directory are not counted, so its module
    /// does not become the newest.
    void Announce(const Announcement& module) {
        if (m_modules.size() >= MAX_MODULES || module.directory.find("..") != std::string::npos)
            return;
        auto sdk = std::make_unique<Sdk>(m_registry);
        const auto directory =
            module.directory.empty() ? Directory() : m_home.Path() + "/" + module.directory;
        sdk->InitSdk(module.id, module.version, module.name, "", directory, &OnFailure, &OnSuccess);
        if (!module.directory.empty())
            return m_elsewhere.push_back(std::move(sdk));
        m_modules.push_back(std::move(sdk));
        if (!m_engine)
            StartUploading();
        using SystemTool::Text::CutUtf8;
        const auto valid = SystemTool::Text::ValidUtf8(CutUtf8(module.id, MAX_ID_BYTES));
        m_collector.modules.emplace(CutUtf8(valid, MAX_ID_BYTES));
    }

    void StartUploading() {
        m_engine = m_registry.Acquire(Directory());
        Require(m_engine != nullptr, "the user's own directory is used");
        m_cycle = std::make_unique<upload::UploadCycle>(
            m_engine->Events(), m_collector, m_engine->Listeners(), OutboxSettings{}, [] { return 0.5; });
    }

    /// Runs one pass of the uploader. The time is so late that no event waits for further ones.
    void Pass(otlp::HttpResult answer) {
        m_collector.answer = std::move(answer);
        const auto pause = m_cycle->Pass(WallNow() + std::chrono::hours(1));
        Require(pause.duration >= std::chrono::milliseconds(0) &&
                    pause.duration <= RetrySettings().maxRetryAfter + RetrySettings().maxRetryAfterSpread,
                "the uploader comes back", std::to_string(pause.duration.count()));
    }

    static constexpr std::size_t MAX_ID_BYTES = 64; ///< Longer ids are cut to this length.

    TemporaryDirectory m_home;
    process::OutboxRegistry m_registry{OutboxSettings{}, [](const char*) -> const char* { return nullptr; },
                                       [this] { return m_home.Path(); }};
    Collector m_collector;
    std::vector<std::unique_ptr<Sdk>> m_modules;
    std::vector<std::unique_ptr<Sdk>> m_elsewhere;
    std::shared_ptr<process::OutboxEngine> m_engine;
    std::unique_ptr<upload::UploadCycle> m_cycle;
    std::int64_t m_accepted = 0;
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    Process process;
    for (const auto& step : Parted({reinterpret_cast<const char*>(data), size}, '\0'))
        if (!step.empty())
            process.Do(step);
    process.RequireEachEventInOnePlace();
    process.RequireOutboxesOnly();
    return 0;
}
