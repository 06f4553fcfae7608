#pragma once

// libzovasdk.so.6: users, groups, privileges, confinement.

#include <sys/types.h>

extern "C" {

struct ZovaVolumeInfo {
    /** Mount path, without a slash at its end. */
    char path[256];
};

/**
 * Finds a data volume with `size` bytes free.
 * @param id receives the volume's number.
 * @param unused is 1.
 * @return 1 if there is one.
 */
int VolumeAvailGet(unsigned long long size, ZovaVolumeInfo* info, int* id, int unused);

/** An account. */
struct ZovaUserRecord {
    char* name;
    uid_t uid;
    gid_t gid;
};

/** Creates the directory with its parents and the given mode; -1 keeps the owner. Negative on failure. */
int ZOVAFSMkdirP(const char* path, int unused, int keepMode, int uid, int gid, unsigned int mode);
/** 0 on success; "system" is root. */
int ZOVAUserGetUGID(const char* user, uid_t* uid, gid_t* gid);
/** Looks an account up; 0 on success, with a record that the caller gives back to `ZOVAUserFree`. */
int ZOVAUserGetByUID(uid_t uid, ZovaUserRecord** user);
/** Frees a record; null is fine. */
void ZOVAUserFree(ZovaUserRecord* user);
/** Preference directory of a user or group as text; negative on failure. */
int ZOVAUserPreferenceDirGet(const char* user, char* buffer, int size);
int ZOVAGroupPreferenceDirGet(const char* group, char* buffer, int size);
/** 1 if the user is a member of the administrators' group, 0 if not; negative on failure. */
int QLIBGroupIsAdminGroupMem(const char* user, int unused);
/** 0 if the user lacks the application privilege from that address. */
int QLIBAppPrivUserHas(const char* user, const char* privilege, const char* address);
/** Not 0 if the process runs under a confining AppArmor profile. */
int ZOVA_aa_has_profile_restricted();

}  // extern "C"
