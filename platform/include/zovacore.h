#pragma once

// libzovacore.so.6: files, locks, processes, configuration.

extern "C" {

/** 1 if the path names something that exists. */
int QLIBCFileExist(const char* path);
/** Not 0 if the key="value" file holds the pair; `unused` is 0. */
int QLIBCFileCheckKeyValue(const char* path, const char* key, const char* value, int unused);
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
 * Forks a child that never writes to the client: its descriptors 0 to 2 are /dev/null.
 * @return as fork.
 */
int QLIBCProcFork();
/**
 * Forks a child that never holds the client's connection nor writes to it: its descriptors 0 to 2 are /dev/null, and
 * copies of the connection are closed. With the flags 65 the child is nobody's to wait for and leaves no zombie.
 * @return as fork; -1 on failure.
 */
int QLIBCProcForkEx(int flags);

}  // extern "C"
