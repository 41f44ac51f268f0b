/*
 * Stand-in for the platform in the launcher's tests. It records what it was
 * started with and then behaves as told by its environment:
 *   RCP_STUB_RECORD  file to write; when it exists already, RECORD.1, RECORD.2,
 *                    ... are tried in turn so that several children of one
 *                    test can be told apart.
 *   RCP_STUB_SLEEP   seconds to stay alive after writing the record.
 *   RCP_STUB_EXIT    exit status (default 0).
 * Record format, every item NUL-terminated so that any text survives:
 *   "ARGV" <argc in decimal> <arg0> ... <argN-1> "ENV" <count> <NAME=value> ...
 * The record is written to a temporary name and renamed into place, so a
 * reader never sees half of it.
 */
#include <fcntl.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <unistd.h>

extern char** environ;

static void put(FILE* f, const char* s) { fwrite(s, 1, strlen(s) + 1, f); }

int main(int argc, char** argv) {
    const char* record = getenv("RCP_STUB_RECORD");
    if (record != NULL && *record != '\0') {
        char path[4096];
        char tmp[4200];
        int n = 0;
        snprintf(path, sizeof path, "%s", record);
        while (access(path, F_OK) == 0 && n < 1000) snprintf(path, sizeof path, "%s.%d", record, ++n);
        snprintf(tmp, sizeof tmp, "%s.tmp.%ld", path, (long)getpid());
        FILE* f = fopen(tmp, "wb");
        if (f != NULL) {
            char num[32];
            int envCount = 0;
            put(f, "ARGV");
            snprintf(num, sizeof num, "%d", argc);
            put(f, num);
            for (int i = 0; i < argc; ++i) put(f, argv[i]);
            for (char** e = environ; *e != NULL; ++e) ++envCount;
            put(f, "ENV");
            snprintf(num, sizeof num, "%d", envCount);
            put(f, num);
            for (char** e = environ; *e != NULL; ++e) put(f, *e);
            fclose(f);
            rename(tmp, path);
        }
    }
    const char* sleepFor = getenv("RCP_STUB_SLEEP");
    if (sleepFor != NULL) sleep((unsigned)atoi(sleepFor));
    const char* status = getenv("RCP_STUB_EXIT");
    return status != NULL ? atoi(status) : 0;
}
