#pragma once

#include <dirent.h>
#include <grp.h>
#include <json/value.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <climits>
#include <cstdlib>
#include <string>
#include <vector>

namespace probe {

inline Json::Value SupplementaryGroups() {
    std::vector<gid_t> groups(NGROUPS_MAX);
    const int count = getgroups(static_cast<int>(groups.size()), groups.data());
    groups.resize(count > 0 ? static_cast<size_t>(count) : 0);
    std::sort(groups.begin(), groups.end());
    Json::Value list(Json::arrayValue);
    for (gid_t group : groups) {
        list.append(group);
    }
    return list;
}

inline Json::Value OpenDescriptors() {
    Json::Value list(Json::arrayValue);
    DIR* directory = opendir("/proc/self/fd");
    if (directory == nullptr) {
        return list;
    }
    std::vector<int> numbers;
    while (const dirent* entry = readdir(directory)) {
        if (entry->d_name[0] != '.' && atoi(entry->d_name) != dirfd(directory)) {
            numbers.push_back(atoi(entry->d_name));
        }
    }
    closedir(directory);
    std::sort(numbers.begin(), numbers.end());
    for (int number : numbers) {
        list.append(number);
    }
    return list;
}

/** What a call may change in its process, as JSON. */
inline Json::Value ProcessState() {
    uid_t user[3] = {};
    gid_t group[3] = {};
    Json::Value state(Json::objectValue);
    if (getresuid(&user[0], &user[1], &user[2]) == 0 && getresgid(&group[0], &group[1], &group[2]) == 0) {
        for (int i = 0; i < 3; ++i) {
            state["user"].append(user[i]);
            state["group"].append(group[i]);
        }
    }
    state["groups"] = SupplementaryGroups();
    state["nice"] = getpriority(PRIO_PROCESS, 0);
    char directory[PATH_MAX] = "";
    state["directory"] = getcwd(directory, sizeof(directory)) == nullptr ? "" : directory;
    state["descriptors"] = OpenDescriptors();
    const char* stack = getenv("APPARMOR_HAT_ARRAY");
    state["hats"] = stack == nullptr ? "" : stack;
    return state;
}

}  // namespace probe
