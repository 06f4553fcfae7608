#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace reference {

constexpr const char* kAdministratorsOwner = "@administrators";
constexpr const char* kUsersOwner = "@users";

constexpr size_t kLongestTaskOwner = 80;
constexpr size_t kLongestTaskPrefix = 32;
constexpr size_t kLongestTaskId = 64;

/** What names a task. Only made of an owner and an id that fit, so that a file name made of it is one. */
struct TaskKey {
    std::string owner;
    std::string id;

    /** "<owner in hex>.<id>" */
    std::string FileName() const;
};

/** 1 to 80 bytes without "/" and control bytes; one that begins with "@" is one of the two shared owners. */
bool IsTaskOwner(std::string_view text);

/** 0 to 32 bytes: letters, digits, "_", "-" and ".", beginning with a letter or digit. */
bool IsTaskPrefix(std::string_view text);

/** Nothing for an owner or id that names no task; an id is as a prefix, of 1 to 64 bytes. Null pointers name none. */
std::optional<TaskKey> MakeTaskKey(const char* owner, const char* id);

/** The id of a record's file name if it belongs to the owner; a view into `file`, empty for any other name. */
std::string_view IdOfTaskFile(std::string_view file, std::string_view owner);

/** The key that the file name stands for. */
std::optional<TaskKey> KeyOfTaskFile(std::string_view file);

}  // namespace reference
