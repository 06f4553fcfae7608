#pragma once

// libzovacore.so.6: files, locks, processes, configuration, texts.

#include <cstddef>

extern "C" {

/** Makes the capital letters A to Z of the text small, in place. `size` counts the NUL at its end; the others are 0. */
void QLIBCStrCaseLower(char* text, int unused, int unusedToo, std::size_t size);
/** Not 0 if the text can be the name of a host. */
int BlQLIBIsHostname(const char* text);
/** Not 0 if the text can be the name of a domain. */
int BlQLIBIsDomain(const char* text);
struct ZovaSzPair {
    char* key;
    char* value;
};

/** A string hash: `count` pairs in hash order, which the hash owns. */
struct ZovaSzHash {
    unsigned int size;
    unsigned int count;
    ZovaSzPair* pairs;
};

/** An empty hash for about `size` pairs; null without memory. */
ZovaSzHash* QLIBCSzHashAlloc(int size);
/** Sets the value of a key, with copies of both; the hash may move. Negative without memory. */
int QLIBCSzHashSetValue(ZovaSzHash** hash, const char* key, const char* value);
void QLIBCHashRemoveAll(ZovaSzHash* hash);
/** Frees the hash with its pairs; null is allowed. */
void QLIBCSzHashFree(ZovaSzHash* hash);

/** Stores the error code of this library, and where it was set; kept until the next is stored. */
void QLIBCErrSetEx(int code, const char* file, int line);
/** The code stored last, 0 before any. */
int QLIBCErrGet();

/** 1 if the path names something that exists. */
int QLIBCFileExist(const char* path);
/** Not 0 if the key="value" file holds the pair; `unused` is 0. */
int QLIBCFileCheckKeyValue(const char* path, const char* key, const char* value, int unused);
/**
 * Sets the key in the device's information file, /etc/zovainfo.conf. The file is replaced as a whole and under a lock;
 * comments and order stay. Negative on failure, with the file left as it was.
 */
int QLIBCINFOSetKeyValue(const char* key, const char* value);
/** Creates the file if needed and sets its times to now; negative on failure. */
int QLIBCFileTouch(const char* path);
/** Sets the file's times to now (with 1, 0); negative on failure. */
int QLIBCFileUTime(const char* path, int now, int time);
/**
 * Takes an exclusive lock (`mode` 1) on the lock file, which is created if needed, waiting at most `seconds`.
 * @param fd receives the descriptor that holds the lock.
 * @return negative on failure or when the time is up; `fd` is then left alone.
 */
int QLIBCFileLockTimeByFile(const char* path, int mode, int seconds, int* fd);
/** Gives the lock back and closes its descriptor. */
int QLIBCFileUnlockByFile(int fd);
/** Idle time of a login session, in minutes. */
int QLIBCConfGetZELMTimeout();
/**
 * Forks a child that never writes to the client: its descriptors 0 to 2 are /dev/null, and copies of the client's
 * connection are closed. The child belongs to init and not to the caller, so that it leaves no zombie in a process that
 * lives on, and the caller neither can nor must wait for it. SIGCHLD stays as the caller has it; a handler may see one
 * signal for a short-lived child that it does not know and that is waited for here.
 * @return as fork: in the parent the child's process id, or -1 with errno.
 */
int QLIBCProcFork();
/**
 * As QLIBCProcFork with the flag 64 (the framework passes 65). Without that flag the child is the caller's own, to be
 * waited for by the caller. Other flags change nothing.
 * @return as fork; -1 on failure.
 */
int QLIBCProcForkEx(int flags);

}  // extern "C"
