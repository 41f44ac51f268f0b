// Preloaded (LD_PRELOAD) into a dynamically linked launcher, this plays
// HFS+, on which a directory listing that goes on while entries are being
// removed may skip entries: after each unlink or rmdir of an entry of a
// directory that is open for listing, the next readdir of that directory
// passes over one entry (and over "." and ".." on the way).
#define _GNU_SOURCE
#include <dirent.h>
#include <dlfcn.h>
#include <string.h>
#include <unistd.h>

#define SHIM_MAX_OPEN 64

static struct {
    DIR* dir;
    char path[4096];
    int skips;
} listings[SHIM_MAX_OPEN];

DIR* opendir(const char* path) {
    DIR* dir = ((DIR * (*)(const char*)) dlsym(RTLD_NEXT, "opendir"))(path);
    for (int i = 0; dir != NULL && i < SHIM_MAX_OPEN; i++)
        if (listings[i].dir == NULL && strlen(path) < sizeof listings[i].path) {
            listings[i].dir = dir, listings[i].skips = 0;
            strcpy(listings[i].path, path);
            break;
        }
    return dir;
}

int closedir(DIR* dir) {
    for (int i = 0; i < SHIM_MAX_OPEN; i++)
        if (listings[i].dir == dir) listings[i].dir = NULL;
    return ((int (*)(DIR*))dlsym(RTLD_NEXT, "closedir"))(dir);
}

struct dirent* readdir(DIR* dir) {
    struct dirent* (*next)(DIR*) = (struct dirent * (*)(DIR*)) dlsym(RTLD_NEXT, "readdir");
    struct dirent* entry = next(dir);
    for (int i = 0; i < SHIM_MAX_OPEN; i++)
        for (; entry != NULL && listings[i].dir == dir && listings[i].skips > 0; entry = next(dir))
            if (strcmp(entry->d_name, ".") != 0 && strcmp(entry->d_name, "..") != 0) listings[i].skips--;
    return entry;
}

// A removed entry of an open directory (the path is "<directory>/<name>").
static int removed(const char* path, int result) {
    const char* slash = strrchr(path, '/');
    for (int i = 0; result == 0 && slash != NULL && i < SHIM_MAX_OPEN; i++)
        if (listings[i].dir != NULL && strncmp(listings[i].path, path, (size_t)(slash - path)) == 0 &&
            listings[i].path[slash - path] == '\0')
            listings[i].skips++;
    return result;
}

int unlink(const char* path) { return removed(path, ((int (*)(const char*))dlsym(RTLD_NEXT, "unlink"))(path)); }
int rmdir(const char* path) { return removed(path, ((int (*)(const char*))dlsym(RTLD_NEXT, "rmdir"))(path)); }
