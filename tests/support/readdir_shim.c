// Preloaded (LD_PRELOAD) into a dynamically linked launcher, this plays
// HFS+, on which a directory listing that goes on while entries are being
// removed may skip entries: after each unlink or rmdir made while a listing
// is open, the next readdir passes over one entry (and over "." and ".." on
// the way).
#define _GNU_SOURCE
#include <dirent.h>
#include <dlfcn.h>
#include <string.h>

static int openListings, skips;

#define NEXT(name, type) ((type)dlsym(RTLD_NEXT, name))

DIR* opendir(const char* path) {
    DIR* dir = NEXT("opendir", DIR * (*)(const char*))(path);
    openListings += dir != NULL;
    return dir;
}

int closedir(DIR* dir) {
    openListings--;
    return NEXT("closedir", int (*)(DIR*))(dir);
}

struct dirent* readdir(DIR* dir) {
    struct dirent* (*next)(DIR*) = NEXT("readdir", struct dirent * (*)(DIR*));
    struct dirent* entry = next(dir);
    for (; entry != NULL && skips > 0; entry = next(dir))
        if (strcmp(entry->d_name, ".") != 0 && strcmp(entry->d_name, "..") != 0) skips--;
    return entry;
}

// A removal counts while a listing is open.
static int removal(int result) {
    skips += result == 0 && openListings > 0;
    return result;
}

int unlink(const char* path) { return removal(NEXT("unlink", int (*)(const char*))(path)); }
int rmdir(const char* path) { return removal(NEXT("rmdir", int (*)(const char*))(path)); }
