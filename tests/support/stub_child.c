/*
 * Stand-in for the program the launcher starts (the Eclipse executable or the
 * JVM). It records what it was given and then behaves as told:
 *
 *   RCP_STUB_RECORD  path of the record file. When that file already exists,
 *                    the record goes to PATH.1, PATH.2, ... (the first free
 *                    one), so several children of one test can be told apart
 *                    in the order they started. The record is written to a
 *                    private file first and then linked into place, so a
 *                    record that can be seen is complete. Unset: no record.
 *   RCP_STUB_SLEEP   seconds to sleep after writing the record (default 0).
 *   RCP_STUB_EXIT    exit status (default 0).
 *
 * Record format: NUL-terminated fields, so that values holding blanks or
 * newlines survive:
 *   "PID"  <process id in decimal>
 *   "ARGV" <count n> <arg 0> ... <arg n-1>
 *   "ENV"  <count m> <entry 0> ... <entry m-1>     (entries are NAME=value)
 *   "END"
 */
#include <errno.h>
#include <fcntl.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <unistd.h>

#define MAX_RECORDS 1000

/* Each field ends in a NUL byte; nonzero on failure. */
static int write_field(int fd, const char* text) { return dprintf(fd, "%s%c", text, '\0') < 0; }

static int write_list(int fd, const char* tag, char** list) {
    long count = 0;
    while (list && list[count]) count++;
    if (write_field(fd, tag) || dprintf(fd, "%ld%c", count, '\0') < 0) return -1;
    for (long i = 0; i < count; i++)
        if (write_field(fd, list[i])) return -1;
    return 0;
}

static int write_record(const char* path, char** argv, char** envp) {
    size_t len = strlen(path) + 64;
    char* tmp = malloc(len);
    char* name = malloc(len);
    int rc = -1;
    if (!tmp || !name) goto out;

    snprintf(tmp, len, "%s.tmp.%ld", path, (long)getpid());
    int fd = open(tmp, O_WRONLY | O_CREAT | O_TRUNC, 0644);
    if (fd < 0) goto out;
    int bad = write_field(fd, "PID") || dprintf(fd, "%ld%c", (long)getpid(), '\0') < 0 ||
              write_list(fd, "ARGV", argv) || write_list(fd, "ENV", envp) || write_field(fd, "END");
    if (close(fd) != 0) bad = 1;
    for (int i = 0; !bad && i < MAX_RECORDS; i++) {
        snprintf(name, len, i ? "%s.%d" : "%s", path, i);
        if (link(tmp, name) == 0) rc = 0;
        if (rc == 0 || errno != EEXIST) break;
    }
    unlink(tmp);
out:
    free(tmp);
    free(name);
    return rc;
}

int main(int argc, char** argv, char** envp) {
    (void)argc;
    const char* record = getenv("RCP_STUB_RECORD");
    if (record && *record) write_record(record, argv, envp);

    const char* nap = getenv("RCP_STUB_SLEEP");
    if (nap && *nap) {
        unsigned seconds = (unsigned)strtoul(nap, NULL, 10);
        while (seconds > 0) seconds = sleep(seconds);
    }

    const char* status = getenv("RCP_STUB_EXIT");
    return status && *status ? atoi(status) : 0;
}
