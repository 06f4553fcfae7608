#pragma once

#include <json/value.h>

#include <optional>
#include <string>
#include <vector>

namespace package {

/** Who is meant: accounts by their names, and the members of groups. */
struct AccessList {
    std::vector<std::string> users;
    std::vector<std::string> groups;
};

/** A folder that several users have in common. Who may write may read too. */
struct SharedFolder {
    std::string name;
    std::string path;
    AccessList read;
    AccessList write;
};

/**
 * The folders of the device's table: `{"folders": [{"name", "path", "read", "write"}]}`, the latter two objects of the
 * lists "users" and "groups", each of which may be missing.
 * @return nullopt if anything in it is not of this form, is there twice, or is too much: 64 folders, names of 1 to 64
 * bytes, paths as clients name them and none within another, 64 users and 64 groups each.
 */
std::optional<std::vector<SharedFolder>> ParseSharedFolders(const Json::Value& table);

}  // namespace package
