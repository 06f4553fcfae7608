#pragma once

#include <sys/stat.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "EntryJson.h"
#include "FileErrors.h"
#include "FolderNames.h"
#include "Viewer.h"

namespace package {

enum class ListKey { kName, kSize, kTime, kType };

/** Which entries of a folder are asked for. */
struct ListOrder {
    ListKey key = ListKey::kName;
    bool descending = false;
    std::size_t offset = 0;
    std::size_t limit = 0;
};

/** One entry with what it is sorted by. */
struct ListedEntry {
    std::string name;
    std::int64_t value = 0;
};

/**
 * The page that `ListOrder` describes of entries that come in any order. Entries of one value stand in the order of
 * their names, compared by bytes; `descending` turns the whole order round. Keeps `offset` + `limit` of them.
 */
class ListPage {
public:
    explicit ListPage(const ListOrder& order) : wanted(order) {}

    void Add(ListedEntry entry);
    /** How many were added. */
    std::uint64_t Total() const { return total; }
    /** The page. Nothing may be added afterwards. */
    std::vector<ListedEntry> Take();

private:
    bool StandsBefore(const ListedEntry& one, const ListedEntry& other) const;

    ListOrder wanted;
    /** A heap, the last one of the order in front. */
    std::vector<ListedEntry> kept;
    std::uint64_t total = 0;
};

/** Reads a folder into a page. What vanishes meanwhile, and what the viewer may not see, is left out. */
FileError ReadFolder(FolderNames& folder, const Viewer& viewer, const ListOrder& order, ListPage& page);

}  // namespace package
