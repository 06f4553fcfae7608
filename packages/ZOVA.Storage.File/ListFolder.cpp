#include "ListFolder.h"

#include <errno.h>
#include <fcntl.h>

#include <string>
#include <utility>

#include "../common/Fence.h"
#include "../common/Parameters.h"
#include "ClientPath.h"
#include "Listing.h"
#include "Requests.h"
#include "Viewer.h"

namespace package {
namespace {

constexpr int kMostOffset = 1000000;
constexpr int kMostLimit = 5000;
constexpr int kUsualLimit = 1000;
constexpr const char* kKeys[] = {"name", "size", "mtime", "type", nullptr};
constexpr const char* kDirections[] = {"asc", "desc", nullptr};

bool ReadOrder(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, ListOrder& order) {
    int offset = 0;
    int limit = kUsualLimit;
    int key = 0;
    int direction = 0;
    if (!ReadInteger(request, response, "offset", 0, kMostOffset, offset) ||
        !ReadInteger(request, response, "limit", 1, kMostLimit, limit) ||
        !ReadWord(request, response, "sort", kKeys, key) ||
        !ReadWord(request, response, "order", kDirections, direction)) {
        return false;
    }
    order.offset = static_cast<std::size_t>(offset);
    order.limit = static_cast<std::size_t>(limit);
    order.key = static_cast<ListKey>(key);
    order.descending = direction == 1;
    return true;
}

void AnswerPage(ZOVA::APIResponse* response, const std::string& path, const ListOrder& order, std::uint64_t total,
                Json::Value entries) {
    Json::Value data(Json::objectValue);
    AddText(data, "path", path);
    data["offset"] = Json::UInt64(order.offset);
    data["total"] = Json::UInt64(total);
    data["entries"] = std::move(entries);
    response->SetSuccess(data);
}

/** The entries of a page as they are now. */
Json::Value Described(const std::vector<ListedEntry>& page, int folder, const std::string& path, const Viewer& viewer) {
    Json::Value entries(Json::arrayValue);
    for (const ListedEntry& entry : page) {
        struct stat status;
        if (fstatat(folder, entry.name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0 && viewer.MaySee(status)) {
            entries.append(EntryJson(Join(path, entry.name), status, viewer.View()));
        }
    }
    return entries;
}

void ListTop(ZOVA::APIRequest* request, ZOVA::APIResponse* response, const ListOrder& order) {
    Viewer viewer;
    std::vector<std::string> paths;
    if (!viewer.BeginAtTop(request, response, paths)) {
        return;
    }
    std::vector<Json::Value> rows;
    for (std::size_t at = 0; at < paths.size(); ++at) {
        UniqueFd opened;
        struct stat status;
        // What cannot be reached, a home that was never made for instance, is none.
        if (viewer.Open(paths[at], O_PATH | O_NOFOLLOW, opened, status) != FILE_OK) {
            continue;
        }
        Json::Value row = EntryJson(paths[at], status, viewer.View());
        if (!viewer.IsVisitor()) {
            row["name"] = viewer.Account().folders[at].name;
            row.removeMember("name_bytes");
            row["writable"] = viewer.Account().folders[at].writable;
        }
        rows.push_back(std::move(row));
    }
    Json::Value entries(Json::arrayValue);
    for (std::size_t at = order.offset; at < rows.size() && at - order.offset < order.limit; ++at) {
        entries.append(rows[at]);
    }
    AnswerPage(response, kTopPath, order, rows.size(), entries);
}

void List(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    std::string path = kTopPath;
    ListOrder order;
    if ((request->HasParam("path") && !ReadPath(request, response, "path", path)) ||
        !ReadOrder(request, response, order)) {
        return;
    }
    if (path == kTopPath) {
        ListTop(request, response, order);
        return;
    }
    Viewer viewer;
    if (!viewer.Begin(request, response, {path})) {
        return;
    }
    UniqueFd opened;
    struct stat status;
    FileError error = viewer.Open(path, O_RDONLY | O_DIRECTORY, opened, status);
    if (error != FILE_OK) {
        Refuse(response, error);
        return;
    }
    FolderNames folder(std::move(opened));
    ListPage page(order);
    error = folder.IsOpen() ? ReadFolder(folder, viewer, order, page) : ErrorOf(errno, "reading a folder");
    if (error != FILE_OK) {
        Refuse(response, error);
        return;
    }
    AnswerPage(response, path, order, page.Total(), Described(page.Take(), folder.Get(), path, viewer));
}

void Stat(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    std::vector<std::string> paths;
    Viewer viewer;
    if (!ReadPaths(request, response, paths) || !viewer.Begin(request, response, paths)) {
        return;
    }
    Json::Value data(Json::objectValue);
    Results results;
    for (const std::string& path : paths) {
        UniqueFd opened;
        struct stat status;
        const FileError error = viewer.Open(path, O_PATH | O_NOFOLLOW, opened, status);
        results.Add(path, error,
                    error == FILE_OK ? EntryJson(path, status, viewer.View()) : Json::Value(Json::objectValue));
    }
    data["results"] = results.Rows();
    response->SetSuccess(data);
}

}  // namespace

void ListFolder(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("list", response, [&] { List(request, response); });
}

void StatPaths(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("stat", response, [&] { Stat(request, response); });
}

}  // namespace package
