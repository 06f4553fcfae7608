#include "SharedFolders.h"

#include <webapi/Json.h>

#include <algorithm>
#include <initializer_list>

#include "ClientPath.h"

namespace package {
namespace {

constexpr Json::ArrayIndex kMostFolders = 64;
constexpr Json::ArrayIndex kMostNames = 64;
constexpr std::size_t kLongestFolderName = 64;
/** As long as an account's name may be. */
constexpr std::size_t kLongestAccount = 492;

bool HasOnly(const Json::Value& object, std::initializer_list<const char*> known) {
    if (object.type() != Json::objectValue) {
        return false;
    }
    const std::vector<std::string> names = object.getMemberNames();
    return std::all_of(names.begin(), names.end(), [&](const std::string& name) {
        return std::find(known.begin(), known.end(), name) != known.end();
    });
}

bool ReadNames(const Json::Value& list, std::vector<std::string>& out) {
    if (list.isNull()) {
        return true;
    }
    if (list.type() != Json::arrayValue || list.size() > kMostNames) {
        return false;
    }
    for (const Json::Value& name : list) {
        const std::string text = name.isString() ? name.asString() : "";
        if (text.empty() || text.size() > kLongestAccount || text.find('\0') != std::string::npos) {
            return false;
        }
        out.push_back(text);
    }
    return true;
}

bool ReadAccess(const Json::Value& access, AccessList& out) {
    return access.isNull() ||
           (HasOnly(access, {"users", "groups"}) && ReadNames(Json::member(access, "users"), out.users) &&
            ReadNames(Json::member(access, "groups"), out.groups));
}

bool ReadFolder(const Json::Value& entry, SharedFolder& out) {
    if (!HasOnly(entry, {"name", "path", "read", "write"})) {
        return false;
    }
    const Json::Value& name = Json::member(entry, "name");
    const Json::Value& path = Json::member(entry, "path");
    out.name = name.isString() ? name.asString() : "";
    out.path = path.isString() ? path.asString() : "";
    return out.name.size() <= kLongestFolderName && IsNewName(out.name) && IsClientPath(out.path) &&
           out.path != kTopPath && ReadAccess(Json::member(entry, "read"), out.read) &&
           ReadAccess(Json::member(entry, "write"), out.write);
}

bool Meet(const SharedFolder& one, const SharedFolder& other) {
    return one.name == other.name || IsWithin(one.path, other.path) || IsWithin(other.path, one.path);
}

}  // namespace

std::optional<std::vector<SharedFolder>> ParseSharedFolders(const Json::Value& table) {
    const Json::Value& list = Json::member(table, "folders");
    if (!HasOnly(table, {"folders"}) || list.type() != Json::arrayValue || list.size() > kMostFolders) {
        return std::nullopt;
    }
    std::vector<SharedFolder> folders;
    for (const Json::Value& entry : list) {
        SharedFolder folder;
        if (!ReadFolder(entry, folder) || std::any_of(folders.begin(), folders.end(),
                                                      [&](const SharedFolder& other) { return Meet(folder, other); })) {
            return std::nullopt;
        }
        folders.push_back(folder);
    }
    return folders;
}

}  // namespace package
