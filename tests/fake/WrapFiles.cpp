// File calls: real ones, recorded, failing on demand, and led elsewhere where the platform says so.

#include <fcntl.h>
#include <fnmatch.h>
#include <glob.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "Wrap.h"

using fake::FakePlatform;
using fake::Shown;

extern "C" {
int __real_open(const char*, int, ...);
int __real_dup2(int, int);
char* __real_getcwd(char*, size_t);
int __real_chdir(const char*);
int __real_stat(const char*, struct stat*);
int __real_rename(const char*, const char*);
int __real_unlink(const char*);
int __real_fchmod(int, mode_t);
int __real_statvfs(const char*, struct statvfs*);
int __real_lchown(const char*, uid_t, gid_t);
ssize_t __real_write(int, const void*, size_t);
size_t __real_fread(void*, size_t, size_t, FILE*);
char* __real_realpath(const char*, char*);
int __real_glob(const char*, int, int (*)(const char*, int), glob_t*);
void __real_globfree(glob_t*);
}

namespace {

int Open(const char* path, int flags, mode_t mode) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_open(path, flags, mode);
    }
    const std::string closing = (flags & O_CLOEXEC) != 0 ? "" : ", kept over exec";
    if (!platform->Enter("open", path + closing, EMFILE)) {
        return -1;
    }
    return __real_open(platform->Redirected(path).c_str(), flags, mode);
}

}  // namespace

FAKE_EXPORT int __wrap_open(const char* path, int flags, ...) {
    mode_t mode = 0;
    if ((flags & O_CREAT) != 0) {
        va_list arguments;
        va_start(arguments, flags);
        mode = va_arg(arguments, mode_t);
        va_end(arguments);
    }
    return Open(path, flags, mode);
}

FAKE_EXPORT int __wrap___open_2(const char* path, int flags) {
    return Open(path, flags, 0);
}

FAKE_EXPORT int __wrap_dup2(int from, int to) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform != nullptr && !platform->Enter("dup2", "onto " + Shown(to), EBUSY)) {
        return -1;
    }
    return __real_dup2(from, to);
}

FAKE_EXPORT char* __wrap_getcwd(char* buffer, size_t size) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform != nullptr && !platform->Enter("getcwd", "", ENOENT)) {
        return nullptr;
    }
    return __real_getcwd(buffer, size);
}

FAKE_EXPORT int __wrap_chdir(const char* path) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_chdir(path);
    }
    return platform->Enter("chdir", path, EACCES) ? __real_chdir(platform->Redirected(path).c_str()) : -1;
}

FAKE_EXPORT int __wrap_stat(const char* path, struct stat* out) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_stat(path, out);
    }
    return platform->Enter("stat", path, EACCES) ? __real_stat(platform->Redirected(path).c_str(), out) : -1;
}

FAKE_EXPORT int __wrap_rename(const char* from, const char* to) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_rename(from, to);
    }
    return platform->Enter("rename", std::string(from) + ", " + to, EACCES)
               ? __real_rename(platform->Redirected(from).c_str(), platform->Redirected(to).c_str())
               : -1;
}

FAKE_EXPORT int __wrap_unlink(const char* path) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_unlink(path);
    }
    return platform->Enter("unlink", path, EACCES) ? __real_unlink(platform->Redirected(path).c_str()) : -1;
}

FAKE_EXPORT int __wrap_fchmod(int fd, mode_t mode) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform != nullptr && !platform->Enter("fchmod", Shown(mode), EPERM)) {
        return -1;
    }
    return __real_fchmod(fd, mode);
}

FAKE_EXPORT int __wrap_statvfs(const char* path, struct statvfs* out) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_statvfs(path, out);
    }
    const auto found = platform->freeBytes.find(path);
    if (!platform->Enter("statvfs", path, EIO) || found == platform->freeBytes.end()) {
        return -1;
    }
    *out = {};
    // Blocks of one byte; another block size, and what root alone may use, are not what counts.
    out->f_frsize = 1;
    out->f_bfree = found->second;
    out->f_bsize = 4096;
    return 0;
}

/** Recorded only: the file of a path need not be there. */
FAKE_EXPORT int __wrap_lchown(const char* path, uid_t uid, gid_t gid) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_lchown(path, uid, gid);
    }
    return platform->Enter("lchown", std::string(path) + ", " + Shown(uid) + ", " + Shown(gid), EPERM) ? 0 : -1;
}

FAKE_EXPORT ssize_t __wrap_write(int fd, const void* bytes, size_t size) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform != nullptr && !platform->Enter("write", Shown(size), ENOSPC)) {
        return -1;
    }
    return __real_write(fd, bytes, size);
}

FAKE_EXPORT size_t __wrap_fread(void* buffer, size_t size, size_t count, FILE* file) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform != nullptr && !platform->Enter("fread", Shown(count), EIO)) {
        return 0;
    }
    return __real_fread(buffer, size, count, file);
}

FAKE_EXPORT char* __wrap_realpath(const char* path, char* resolved) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform != nullptr && !platform->Enter("realpath", path, EACCES)) {
        return nullptr;
    }
    return __real_realpath(path, resolved);
}

/** Matches the platform's description files; only the working directory is asked for. */
FAKE_EXPORT int __wrap_glob(const char* pattern, int flags, int (*onError)(const char*, int), glob_t* out) {
    FakePlatform* platform = FakePlatform::Active();
    if (platform == nullptr) {
        return __real_glob(pattern, flags, onError, out);
    }
    if (flags != 0 || strchr(pattern, '/') != nullptr) {
        fake::Unmodelled("glob outside the working directory");
    }
    if (!platform->Enter("glob", pattern, EACCES)) {
        return GLOB_ABORTED;
    }
    out->gl_pathv = static_cast<char**>(malloc((platform->files.size() + 1) * sizeof(char*)));
    for (const auto& file : platform->files) {
        if (fnmatch(pattern, file.first.c_str(), FNM_PATHNAME | FNM_PERIOD) == 0) {
            out->gl_pathv[out->gl_pathc++] = strdup(file.first.c_str());
        }
    }
    return out->gl_pathc == 0 ? GLOB_NOMATCH : 0;
}

FAKE_EXPORT void __wrap_globfree(glob_t* out) {
    if (FakePlatform::Active() == nullptr) {
        __real_globfree(out);
        return;
    }
    for (size_t i = 0; i < out->gl_pathc; ++i) {
        free(out->gl_pathv[i]);
    }
    free(out->gl_pathv);
    *out = glob_t{};
}
