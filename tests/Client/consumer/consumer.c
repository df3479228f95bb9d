#include <stdio.h>

#include <hublink/report.h>

int main(void) {
    hublink_reporter* reporter = hublink_reporter_new("A100", NULL, NULL);
    puts(hublink_result_name(hublink_reporter_event(reporter, "A100|1", NULL)));
    hublink_reporter_free(reporter);
    return 0;
}
