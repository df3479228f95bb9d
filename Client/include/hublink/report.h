/* The library's interface for C, and for languages that can call C. hublink/report.hpp documents it in full:
 * what each result means, that any thread may call, and that a reporter also works in the child of a fork.
 *
 *     hublink_reporter *reporter = hublink_reporter_new("A100", "2.1", "Painter");
 *     hublink_reporter_event_json(reporter, "A100|10001", "{\"clicks\":3}");
 *     hublink_reporter_event(reporter, "B100|10001", "it's a text as it is");
 *     hublink_reporter_free(reporter);
 *
 * All texts are UTF-8 and end in a zero byte. The library does not use them after the call has returned.
 */
#ifndef HUBLINK_REPORT_H
#define HUBLINK_REPORT_H

/* NOLINTBEGIN(modernize-*): it is C */
#include <stdint.h>

#if defined(__GNUC__)
#define HUBLINK_C_EXPORT __attribute__((visibility("default")))
#define HUBLINK_C_USE_RESULT __attribute__((warn_unused_result))
#else
#define HUBLINK_C_EXPORT
#define HUBLINK_C_USE_RESULT
#endif

#ifdef __cplusplus
extern "C" {
#endif

/* What happened to an event, or to a user that was set. The values never change. */
typedef enum hublink_result {
    HUBLINK_SENT = 0,
    HUBLINK_NOBODY_LISTENS = 1,
    HUBLINK_TOO_LONG = 2,
    HUBLINK_INVALID_TEXT = 3,
    HUBLINK_INVALID_JSON = 4,
    HUBLINK_INVALID_EVENT_ID = 5,
    HUBLINK_QUOTE_IN_USER = 6,
    HUBLINK_OTHER_USERS_SERVICE = 7,
    HUBLINK_WOULD_BLOCK = 8,
    HUBLINK_SYSTEM_ERROR = 9
} hublink_result;

typedef struct hublink_reporter hublink_reporter;

/* Makes a reporter for the local store and for the program's own module. When module_id is NULL, it has no
 * such module. Returns NULL when there is no memory. Every function below accepts that NULL as its reporter:
 * it returns HUBLINK_SYSTEM_ERROR or a count of 0, or does nothing. Give the reporter back with
 * hublink_reporter_free. */
HUBLINK_C_EXPORT HUBLINK_C_USE_RESULT hublink_reporter*
hublink_reporter_new(const char* module_id, const char* module_version, const char* module_name);

/* Makes a reporter as hublink_reporter_new does, but this one also reports to a service that runs for another
 * user. Its events then go into that user's store. */
HUBLINK_C_EXPORT HUBLINK_C_USE_RESULT hublink_reporter*
hublink_reporter_new_for_any_service(const char* module_id, const char* module_version,
                                     const char* module_name);

/* Frees a reporter. No other call with this reporter may be running. Does nothing with NULL. */
HUBLINK_C_EXPORT void hublink_reporter_free(hublink_reporter* reporter);

/* Reports that something happened now. The value is a text, for the store only; NULL means no value. */
HUBLINK_C_EXPORT hublink_result hublink_reporter_event(hublink_reporter* reporter, const char* event_id,
                                                       const char* text);

/* Reports that something happened now. The value is JSON; NULL means no value. */
HUBLINK_C_EXPORT hublink_result hublink_reporter_event_json(hublink_reporter* reporter, const char* event_id,
                                                            const char* json);

/* Tells the service who is signed in. When suite_version is NULL or empty, the service keeps the version that
 * it knows; a service that was restarted is told the last version that was given here and not empty. */
HUBLINK_C_EXPORT hublink_result hublink_reporter_set_user(hublink_reporter* reporter, const char* open_id,
                                                          const char* suite_version);

/* How many calls of hublink_reporter_event, hublink_reporter_event_json and hublink_reporter_set_user with
 * this reporter returned this result. */
HUBLINK_C_EXPORT uint64_t hublink_reporter_count(const hublink_reporter* reporter, hublink_result result);

/* The result's name, such as "NobodyListens". The text stays valid until the program ends. */
HUBLINK_C_EXPORT const char* hublink_result_name(hublink_result result);

#ifdef __cplusplus
}
#endif
/* NOLINTEND(modernize-*) */

#endif
