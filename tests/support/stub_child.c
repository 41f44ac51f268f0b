/*
 * Stand-in for the program the launcher starts (the Eclipse executable or the
 * JVM). It records what it was given in the directory RCP_STUB_RECORD (which
 * must be set), in a file named by its process id: the argument count, the
 * arguments and the environment entries, each ending in a NUL byte (values
 * may hold blanks and newlines). The record is written under a work name and
 * renamed into place, so a record that can be seen is complete. Then it
 * sleeps RCP_STUB_SLEEP seconds and exits with RCP_STUB_EXIT (default 0).
 */
#include <stdio.h>
#include <stdlib.h>
#include <unistd.h>

int main(int argc, char** argv, char** envp) {
    char work[4200], name[4100];
    snprintf(name, sizeof name, "%.4000s/%ld", getenv("RCP_STUB_RECORD"), (long)getpid());
    snprintf(work, sizeof work, "%s.work", name);
    FILE* f = fopen(work, "w");
    if (f == NULL) return 111;
    fprintf(f, "%d%c", argc, 0);
    for (char** p = argv; *p; p++) fprintf(f, "%s%c", *p, 0);
    for (char** p = envp; *p; p++) fprintf(f, "%s%c", *p, 0);
    if (fclose(f) != 0 || rename(work, name) != 0) return 111;
    for (unsigned s = getenv("RCP_STUB_SLEEP") ? (unsigned)atoi(getenv("RCP_STUB_SLEEP")) : 0; s > 0;) s = sleep(s);
    return getenv("RCP_STUB_EXIT") ? atoi(getenv("RCP_STUB_EXIT")) : 0;
}
