/*
 * run_child OUT PROGRAM [ARGS...]
 *
 * Starts PROGRAM with fork and execv (the environment is passed on), waits
 * for it with wait4, and, unless OUT is "-", writes one line to the file OUT:
 *   "<exit status> <ru_maxrss in KiB> <user + system CPU time in microseconds>"
 * Exits with 0 when PROGRAM could be started, 1 otherwise.
 *
 * The launch benchmark uses it twice:
 *  - as the least any launcher could cost: a process that only starts the
 *    child and waits for it, with nothing else to do;
 *  - to read the peak resident size of one launch. A process started
 *    directly by the (much larger) benchmark would carry the benchmark's own
 *    resident size in ru_maxrss, since that figure survives exec; this small
 *    program in between keeps the figure down to the launcher's own.
 */
#include <stdio.h>
#include <sys/resource.h>
#include <sys/time.h>
#include <sys/types.h>
#include <sys/wait.h>
#include <unistd.h>

int main(int argc, char** argv) {
    if (argc < 3) return 1;
    pid_t pid = fork();
    if (pid < 0) return 1;
    if (pid == 0) {
        execv(argv[2], argv + 2);
        _exit(127);
    }
    int status = 0;
    struct rusage ru;
    if (wait4(pid, &status, 0, &ru) != pid) return 1;
    int code = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    if (argv[1][0] != '-' || argv[1][1] != '\0') {
        FILE* out = fopen(argv[1], "w");
        if (out == NULL) return 1;
        long cpu = (long)(ru.ru_utime.tv_sec + ru.ru_stime.tv_sec) * 1000000L + (long)ru.ru_utime.tv_usec +
                   (long)ru.ru_stime.tv_usec;
#ifdef __APPLE__
        long maxrssKiB = (long)(ru.ru_maxrss / 1024); /* bytes there */
#else
        long maxrssKiB = (long)ru.ru_maxrss;
#endif
        fprintf(out, "%d %ld %ld\n", code, maxrssKiB, cpu);
        if (fclose(out) != 0) return 1;
    }
    return code == 127 ? 1 : 0;
}
