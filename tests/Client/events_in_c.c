/* Sends events that it reads from standard input, and answers each with one byte, which is the result. An
 * event is a letter (n for no value, t for a text, j for JSON), the lengths of id and value as two numbers of
 * 32 bits, the id and the value. */
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>

#include <hublink/report.h>

static char* read_text(uint32_t length) {
    char* text = malloc((size_t)length + 1);
    if (text == NULL || fread(text, 1, length, stdin) != length)
        exit(1);
    text[length] = '\0';
    return text;
}

static hublink_result send_one(hublink_reporter* reporter, int kind, const char* id, const char* value) {
    if (kind == 'j')
        return hublink_reporter_event_json(reporter, id, value);
    return hublink_reporter_event(reporter, id, kind == 't' ? value : NULL);
}

int main(void) {
    hublink_reporter* reporter = hublink_reporter_new("A100", "2.1", "Painter");
    int kind;
    while ((kind = getchar()) != EOF) {
        uint32_t lengths[2];
        if (fread(lengths, sizeof lengths[0], 2, stdin) != 2)
            return 1;
        char* id = read_text(lengths[0]);
        char* value = read_text(lengths[1]);
        putchar((char)send_one(reporter, kind, id, value));
        fflush(stdout);
        free(id);
        free(value);
    }
    hublink_reporter_free(reporter);
    return 0;
}
