#include "EntryJson.h"

#include "../common/Text.h"
#include "ClientPath.h"

namespace package {
namespace {

constexpr mode_t kPermissions = 07777;

const char* TypeName(EntryType type) {
    switch (type) {
        case EntryType::kFolder:
            return "folder";
        case EntryType::kFile:
            return "file";
        case EntryType::kLink:
            return "link";
        default:
            return "other";
    }
}

/** All but letters, digits, "-", "_", "." and "/" as "%XX". */
std::string PercentEncoded(const std::string& text) {
    constexpr char kDigits[] = "0123456789ABCDEF";
    std::string encoded;
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if ((byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || (byte >= '0' && byte <= '9') || c == '-' ||
            c == '_' || c == '.' || c == '/') {
            encoded += c;
        } else {
            encoded += {'%', kDigits[byte >> 4], kDigits[byte & 15]};
        }
    }
    return encoded;
}

}  // namespace

EntryType TypeOf(mode_t mode) {
    if (S_ISDIR(mode)) {
        return EntryType::kFolder;
    }
    if (S_ISREG(mode)) {
        return EntryType::kFile;
    }
    return S_ISLNK(mode) ? EntryType::kLink : EntryType::kOther;
}

void AddText(Json::Value& object, const std::string& member, const std::string& text) {
    const std::string shown = ValidUtf8(text);
    object[member] = shown;
    if (shown != text) {
        object[member + "_bytes"] = PercentEncoded(text);
    }
}

Json::Value EntryJson(const std::string& path, const struct stat& status, EntryView view) {
    Json::Value entry(Json::objectValue);
    AddText(entry, "name", NameOf(path));
    AddText(entry, "path", path);
    const EntryType type = TypeOf(status.st_mode);
    entry["type"] = TypeName(type);
    entry["mtime"] = Json::Int64(status.st_mtime);
    if (type == EntryType::kFile) {
        entry["size"] = Json::Int64(status.st_size);
    }
    if (view == EntryView::kAccount) {
        entry["mode"] = static_cast<Json::UInt>(status.st_mode & kPermissions);
        entry["uid"] = static_cast<Json::UInt>(status.st_uid);
        entry["gid"] = static_cast<Json::UInt>(status.st_gid);
    }
    return entry;
}

}  // namespace package
