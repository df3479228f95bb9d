/* Reporting from C: tells which user signed in, then sends an event for the store and one for analytics. */
#include <stdio.h>

#include <hublink/report.h>

static int told(const char* what, hublink_result result) {
    printf("%s: %s\n", what, hublink_result_name(result));
    return result == HUBLINK_SENT;
}

int main(void) {
    hublink_reporter* reporter = hublink_reporter_new("A100", "2.1", "Painter");
    int good = told("user", hublink_reporter_set_user(reporter, "u4711", "5.1.0.2"));
    good &= told("text", hublink_reporter_event(reporter, "B100|10003", "a 'quoted' text"));
    good &= told("JSON", hublink_reporter_event_json(reporter, "A100|10003", "{\"clicks\":3}"));
    hublink_reporter_free(reporter);
    return good ? 0 : 1;
}
