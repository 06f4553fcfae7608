#pragma once

#include <sys/types.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

#include <string>
#include <vector>

namespace package {

/** A folder in which a caller's files lie. */
struct CallerFolder {
    std::string name;
    /** Absolute path on the device, which is also how clients name it. */
    std::string path;
    bool writable = false;
};

/** The account in whose name files are touched, and where. */
struct Caller {
    std::string user;
    uid_t uid = 0;
    /** Home first, then the shared folders that the account may read. */
    std::vector<CallerFolder> folders;
    /** False if the device's table is there but cannot be used; the folders are then the home alone. */
    bool isTableGood = true;
};

/**
 * Looks an account up. Needs effective root, as the table is root's. Logs a table that cannot be used.
 * @return false if there is no such account, or if it is root's.
 */
bool FindCaller(const std::string& user, Caller& out);

/**
 * The check in front of every method: finds the account that the call is for while the process is still root, the one
 * that is logged in, or for a visitor the owner of the link. Refuses with 117.
 */
bool PrepareCall(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

/** What the check in front of this call found. */
const Caller& CurrentCaller();

/**
 * Makes the process run as the account, for good.
 * @return false if it could not be taken as a whole; nothing may be touched then.
 */
bool TakeIdentity(const Caller& caller);

}  // namespace package
