#include "taskmanager/TaskKey.h"

#include <algorithm>

#include "common/Hex.h"

namespace reference {

namespace {

bool IsAlphanumeric(char c) {
    return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

bool IsIdByte(char c) {
    return IsAlphanumeric(c) || c == '_' || c == '-' || c == '.';
}

bool IsIdText(std::string_view text) {
    return std::all_of(text.begin(), text.end(), IsIdByte) && (text.empty() || IsAlphanumeric(text.front()));
}

bool IsTaskId(std::string_view text) {
    return !text.empty() && text.size() <= kLongestTaskId && IsIdText(text);
}

bool IsOwnerByte(char c) {
    const auto byte = static_cast<unsigned char>(c);
    return byte >= 0x20 && byte != 0x7f && c != '/';
}

int HexDigit(char c) {
    if (c >= '0' && c <= '9') {
        return c - '0';
    }
    return c >= 'a' && c <= 'f' ? c - 'a' + 10 : -1;
}

/** The bytes of a text in lower-case hex, "" for any other text. */
std::string BytesOfHex(std::string_view hex) {
    std::string bytes;
    if (hex.size() % 2 != 0) {
        return bytes;
    }
    for (size_t at = 0; at < hex.size(); at += 2) {
        const int high = HexDigit(hex[at]);
        const int low = HexDigit(hex[at + 1]);
        if (high < 0 || low < 0) {
            return "";
        }
        bytes += static_cast<char>(high * 16 + low);
    }
    return bytes;
}

}  // namespace

std::string TaskKey::FileName() const {
    return HexText(owner) + "." + id;
}

bool IsTaskOwner(std::string_view text) {
    if (text.empty() || text.size() > kLongestTaskOwner) {
        return false;
    }
    if (text.front() == '@') {
        return text == kAdministratorsOwner || text == kUsersOwner;
    }
    return std::all_of(text.begin(), text.end(), IsOwnerByte);
}

bool IsTaskPrefix(std::string_view text) {
    return text.size() <= kLongestTaskPrefix && IsIdText(text);
}

std::optional<TaskKey> MakeTaskKey(const char* owner, const char* id) {
    if (owner == nullptr || id == nullptr || !IsTaskOwner(owner) || !IsTaskId(id)) {
        return std::nullopt;
    }
    return TaskKey{owner, id};
}

std::string_view IdOfTaskFile(std::string_view file, std::string_view owner) {
    const std::string start = HexText(owner) + ".";
    if (file.substr(0, start.size()) != start || !IsTaskId(file.substr(start.size()))) {
        return {};
    }
    return file.substr(start.size());
}

std::optional<TaskKey> KeyOfTaskFile(std::string_view file) {
    const size_t dot = file.find('.');
    if (dot == std::string_view::npos) {
        return std::nullopt;
    }
    const std::string owner = BytesOfHex(file.substr(0, dot));
    const std::string_view id = file.substr(dot + 1);
    if (!IsTaskOwner(owner) || !IsTaskId(id)) {
        return std::nullopt;
    }
    return TaskKey{owner, std::string(id)};
}

}  // namespace reference
