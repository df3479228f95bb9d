#include "hublink/report.h"

#include <new>
#include <string>
#include <string_view>

#include "hublink/report.hpp"

struct hublink_reporter {
    hublink_reporter(const hublink::Module& module, const hublink::Options& options)
        : reporter(module, options) {}

    hublink::Reporter reporter;
};

namespace {

using hublink::Result;

// The values for C++ and for C must be equal, because the functions below cast one to the other.
static_assert(static_cast<int>(Result::Sent) == HUBLINK_SENT);
static_assert(static_cast<int>(Result::NobodyListens) == HUBLINK_NOBODY_LISTENS);
static_assert(static_cast<int>(Result::TooLong) == HUBLINK_TOO_LONG);
static_assert(static_cast<int>(Result::InvalidText) == HUBLINK_INVALID_TEXT);
static_assert(static_cast<int>(Result::InvalidJson) == HUBLINK_INVALID_JSON);
static_assert(static_cast<int>(Result::InvalidEventId) == HUBLINK_INVALID_EVENT_ID);
static_assert(static_cast<int>(Result::QuoteInUser) == HUBLINK_QUOTE_IN_USER);
static_assert(static_cast<int>(Result::OtherUsersService) == HUBLINK_OTHER_USERS_SERVICE);
static_assert(static_cast<int>(Result::WouldBlock) == HUBLINK_WOULD_BLOCK);
static_assert(static_cast<int>(Result::SystemError) == HUBLINK_SYSTEM_ERROR);

hublink_result InC(Result result) {
    return static_cast<hublink_result>(result);
}

/// The text as a view; an empty view for a null pointer.
std::string_view TextOf(const char* text) {
    return text == nullptr ? std::string_view() : std::string_view(text);
}

hublink::Value JsonOf(const char* json) {
    return json == nullptr ? hublink::Value() : hublink::Value(hublink::Json{json});
}

hublink_reporter* NewReporter(const char* id, const char* version, const char* name,
                              const hublink::Options& options) {
    try {
        const hublink::Module module{std::string(TextOf(id)), std::string(TextOf(version)),
                                     std::string(TextOf(name))};
        return new hublink_reporter(module, options);
    } catch (const std::bad_alloc&) {
        return nullptr;
    }
}

hublink_result SendEvent(hublink_reporter* reporter, const char* eventId, hublink::Value value) {
    return reporter == nullptr ? HUBLINK_SYSTEM_ERROR : InC(reporter->reporter.Event(TextOf(eventId), value));
}

} // namespace

hublink_reporter* hublink_reporter_new(const char* module_id, const char* module_version,
                                       const char* module_name) {
    return NewReporter(module_id, module_version, module_name, {});
}

hublink_reporter* hublink_reporter_new_for_any_service(const char* module_id, const char* module_version,
                                                       const char* module_name) {
    hublink::Options options;
    options.allowOtherUsersService = true;
    return NewReporter(module_id, module_version, module_name, options);
}

void hublink_reporter_free(hublink_reporter* reporter) {
    delete reporter;
}

hublink_result hublink_reporter_event(hublink_reporter* reporter, const char* event_id, const char* text) {
    return SendEvent(reporter, event_id, hublink::Value(text));
}

hublink_result hublink_reporter_event_json(hublink_reporter* reporter, const char* event_id,
                                           const char* json) {
    return SendEvent(reporter, event_id, JsonOf(json));
}

hublink_result hublink_reporter_set_user(hublink_reporter* reporter, const char* open_id,
                                         const char* suite_version) {
    return reporter == nullptr ? HUBLINK_SYSTEM_ERROR
                               : InC(reporter->reporter.SetUser(TextOf(open_id), TextOf(suite_version)));
}

uint64_t hublink_reporter_count(const hublink_reporter* reporter, hublink_result result) {
    return reporter == nullptr ? 0 : reporter->reporter.Count(static_cast<Result>(result));
}

const char* hublink_result_name(hublink_result result) {
    return hublink::ToString(static_cast<Result>(result));
}
