/* The same library for C, and for what can call C. hublink/report.hpp tells it in full: what each result
 * means, which threads may call (any), and what survives a fork (everything).
 *
 *     hublink_reporter *reporter = hublink_reporter_new("A100", "2.1", "Painter");
 *     hublink_reporter_event_json(reporter, "A100|10001", "{\"clicks\":3}");
 *     hublink_reporter_event(reporter, "B100|10001", "it's a text as it is");
 *     hublink_reporter_free(reporter);
 *
 * All texts are UTF-8, end in a zero byte, and are copied or used before the call returns.
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

/* A reporter for the local store and for a module of the program's own; with NULLs, without such a module.
 * NULL when there is no memory, which every function below takes: it answers HUBLINK_SYSTEM_ERROR, or does
 * nothing. */
HUBLINK_C_EXPORT HUBLINK_C_USE_RESULT hublink_reporter*
hublink_reporter_new(const char* module_id, const char* module_version, const char* module_name);

/* The same, but it reports also to a service that runs for another user, into that user's store. */
HUBLINK_C_EXPORT HUBLINK_C_USE_RESULT hublink_reporter*
hublink_reporter_new_for_any_service(const char* module_id, const char* module_version,
                                     const char* module_name);

/* Ends a reporter. No other call may be under way. NULL is no reporter and does nothing. */
HUBLINK_C_EXPORT void hublink_reporter_free(hublink_reporter* reporter);

/* Reports that something happened now, with a text for the store, or with nothing (NULL). */
HUBLINK_C_EXPORT hublink_result hublink_reporter_event(hublink_reporter* reporter, const char* event_id,
                                                       const char* text);

/* Reports that something happened now, with JSON; NULL is nothing. */
HUBLINK_C_EXPORT hublink_result hublink_reporter_event_json(hublink_reporter* reporter, const char* event_id,
                                                            const char* json);

/* Tells who is signed in. A version that is NULL or empty leaves the one that is known. */
HUBLINK_C_EXPORT hublink_result hublink_reporter_set_user(hublink_reporter* reporter, const char* open_id,
                                                          const char* suite_version);

/* How many calls for this reporter ended so. */
HUBLINK_C_EXPORT uint64_t hublink_reporter_count(const hublink_reporter* reporter, hublink_result result);

/* The result's name, such as "NobodyListens"; lasts for ever. */
HUBLINK_C_EXPORT const char* hublink_result_name(hublink_result result);

#ifdef __cplusplus
}
#endif
/* NOLINTEND(modernize-*) */

#endif
