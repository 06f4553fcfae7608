#include "Listing.h"

#include <errno.h>
#include <fcntl.h>

#include <algorithm>
#include <utility>

namespace package {
namespace {

std::int64_t ValueOf(ListKey key, const struct stat& status) {
    switch (key) {
        case ListKey::kSize:
            return S_ISREG(status.st_mode) ? status.st_size : 0;
        case ListKey::kTime:
            return status.st_mtime;
        case ListKey::kType:
            return static_cast<std::int64_t>(TypeOf(status.st_mode));
        default:
            return 0;
    }
}

/** Whether the order needs no more of an entry than what the folder itself tells. */
bool IsToldByFolder(ListKey key, const dirent* entry, std::int64_t& value) {
    if (key == ListKey::kType && entry->d_type != DT_UNKNOWN) {
        value = static_cast<std::int64_t>(TypeOf(DTTOIF(entry->d_type)));
    }
    return key == ListKey::kName || (key == ListKey::kType && entry->d_type != DT_UNKNOWN);
}

}  // namespace

bool ListPage::StandsBefore(const ListedEntry& one, const ListedEntry& other) const {
    const ListedEntry& first = wanted.descending ? other : one;
    const ListedEntry& second = wanted.descending ? one : other;
    return first.value != second.value ? first.value < second.value : first.name < second.name;
}

void ListPage::Add(ListedEntry entry) {
    ++total;
    const auto before = [this](const ListedEntry& one, const ListedEntry& other) { return StandsBefore(one, other); };
    if (kept.size() == wanted.offset + wanted.limit) {
        if (kept.empty() || !StandsBefore(entry, kept.front())) {
            return;
        }
        std::pop_heap(kept.begin(), kept.end(), before);
        kept.pop_back();
    }
    kept.push_back(std::move(entry));
    std::push_heap(kept.begin(), kept.end(), before);
}

std::vector<ListedEntry> ListPage::Take() {
    std::sort_heap(kept.begin(), kept.end(),
                   [this](const ListedEntry& one, const ListedEntry& other) { return StandsBefore(one, other); });
    const std::size_t first = std::min(wanted.offset, kept.size());
    kept.erase(kept.begin(), kept.begin() + static_cast<std::ptrdiff_t>(first));
    return std::move(kept);
}

FileError ReadFolder(FolderNames& folder, const Viewer& viewer, const ListOrder& order, ListPage& page) {
    while (const dirent* entry = folder.Next()) {
        std::int64_t value = 0;
        if (!IsToldByFolder(order.key, entry, value) || viewer.IsVisitor()) {
            struct stat status;
            if (fstatat(folder.Get(), entry->d_name, &status, AT_SYMLINK_NOFOLLOW) != 0 || !viewer.MaySee(status)) {
                continue;
            }
            value = ValueOf(order.key, status);
        }
        page.Add({entry->d_name, value});
    }
    return errno == 0 ? FILE_OK : ErrorOf(errno, "reading a folder");
}

}  // namespace package
