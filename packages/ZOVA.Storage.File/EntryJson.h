#pragma once

#include <json/value.h>
#include <sys/stat.h>

#include <string>

namespace package {

/** What something is, as a client reads it. The order is that of a list sorted by type. */
enum class EntryType { kFolder, kFile, kLink, kOther };

EntryType TypeOf(mode_t mode);

/** How much of an entry is shown. */
enum class EntryView {
    /** To an account: rights and owner too. */
    kAccount,
    /** To a visitor. */
    kVisitor,
};

/**
 * "name", "path", "type" ("folder", "file", "link", "other"), "mtime" in seconds since the epoch, "size" in bytes of a
 * file; for an account "mode" (permission bits), "uid" and "gid".
 * A text that is no UTF-8 is shown with U+FFFD, and has its bytes percent-encoded beside it: "name_bytes",
 * "path_bytes", which stand in a URL as they are.
 */
Json::Value EntryJson(const std::string& path, const struct stat& status, EntryView view);

/** Adds a text of any bytes to an object, as above: `member`, and `member` with "_bytes" where that is needed. */
void AddText(Json::Value& object, const std::string& member, const std::string& text);

}  // namespace package
