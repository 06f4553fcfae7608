#include "Groups.h"

#include <errno.h>
#include <grp.h>

#include <algorithm>
#include <cstddef>
#include <utility>

namespace package {
namespace {

constexpr int kFirstCount = 64;
constexpr int kMostGroups = 65536;
constexpr std::size_t kFirstBuffer = 4096;
/** The entry of a group holds the names of all its members. */
constexpr std::size_t kLargestBuffer = 16 << 20;

}  // namespace

std::string GroupName(gid_t gid) {
    for (std::size_t size = kFirstBuffer; size <= kLargestBuffer; size *= 4) {
        std::vector<char> buffer(size);
        group entry = {};
        group* found = nullptr;
        const int error = getgrgid_r(gid, &entry, buffer.data(), buffer.size(), &found);
        if (found != nullptr) {
            return found->gr_name;
        }
        if (error != ERANGE) {
            break;
        }
    }
    return std::to_string(gid);
}

bool GroupNames(const std::string& account, gid_t gid, std::vector<std::string>& out) {
    std::vector<gid_t> ids(kFirstCount);
    int count = kFirstCount;
    while (getgrouplist(account.c_str(), gid, ids.data(), &count) < 0) {
        if (ids.size() >= kMostGroups) {
            return false;
        }
        const std::size_t doubled = ids.size() * 2;
        ids.resize(std::min<std::size_t>(kMostGroups, std::max<std::size_t>(doubled, count > 0 ? count : 0)));
        count = static_cast<int>(ids.size());
    }
    std::vector<std::string> names;
    for (int at = 0; at < count; ++at) {
        names.push_back(GroupName(ids[at]));
    }
    out = std::move(names);
    return true;
}

}  // namespace package
