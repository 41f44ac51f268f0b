// Preloaded (LD_PRELOAD) into a dynamically linked launcher, this plays
// HFS+, on which a directory listing that goes on while entries are being
// removed may skip entries: after each unlink or rmdir, the listing read next
// passes over one entry (and over "." and ".." on the way), until a listing
// is opened afresh. A removal that reads every name of a directory before it
// removes any never meets a skip; one that removes while it reads leaves
// entries behind.
#define _GNU_SOURCE
#include <dirent.h>
#include <dlfcn.h>
#include <string.h>

static int skips;

#define NEXT(name, type) ((type)dlsym(RTLD_NEXT, name))

DIR* opendir(const char* path) {
    skips = 0;
    return NEXT("opendir", DIR * (*)(const char*))(path);
}

struct dirent* readdir(DIR* dir) {
    struct dirent* (*next)(DIR*) = NEXT("readdir", struct dirent * (*)(DIR*));
    struct dirent* entry = next(dir);
    for (; entry != NULL && skips > 0; entry = next(dir))
        if (strcmp(entry->d_name, ".") != 0 && strcmp(entry->d_name, "..") != 0) skips--;
    return entry;
}

static int removal(int result) {
    skips += result == 0;
    return result;
}

int unlink(const char* path) { return removal(NEXT("unlink", int (*)(const char*))(path)); }
int rmdir(const char* path) { return removal(NEXT("rmdir", int (*)(const char*))(path)); }
