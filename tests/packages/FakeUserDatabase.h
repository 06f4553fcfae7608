#pragma once

#include <sys/types.h>

#include <cstddef>
#include <map>
#include <string>
#include <vector>

/**
 * The user database under `getpwnam_r`, `getpwent`, `getgrgid_r`, `getgrnam_r` and `getgrouplist` of the test program,
 * with state that a test sets.
 */
struct FakeUserDatabase {
    struct Entry {
        std::string name;
        uid_t uid;
        gid_t gid;
        std::string comment;
        std::string home;
        std::string shell;
    };

    std::vector<Entry> users;
    std::map<gid_t, std::string> groups;
    /** Further groups of an account. */
    std::map<std::string, std::vector<gid_t>> memberships;
    /** Not 0: looking up one account fails with it. */
    int lookupError = 0;
    /** Not 0: the list ends with it after the first entry. */
    int listError = 0;
    /** Buffers below this size are refused with ERANGE. */
    std::size_t smallestBuffer = 0;
    std::size_t listed = 0;

    static FakeUserDatabase& Instance();
    static FakeUserDatabase& Renew();
};
