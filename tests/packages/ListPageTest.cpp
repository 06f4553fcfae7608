#include <gtest/gtest.h>

#include <algorithm>
#include <random>

#include "../../packages/ZOVA.Storage.File/Listing.h"

namespace {

using package::ListedEntry;
using package::ListOrder;
using package::ListPage;

std::string NamesOf(const ListOrder& order, const std::vector<ListedEntry>& entries) {
    ListPage page(order);
    for (const ListedEntry& entry : entries) {
        page.Add(entry);
    }
    EXPECT_EQ(page.Total(), entries.size());
    std::string names;
    for (const ListedEntry& entry : page.Take()) {
        names += entry.name + " ";
    }
    return names;
}

const std::vector<ListedEntry> kEntries = {{"c", 1}, {"a", 2}, {"d", 1}, {"b", 2}, {"B", 3}};

TEST(ListPage, StandsInTheOrderOfValuesAndThenOfNames) {
    EXPECT_EQ(NamesOf({package::ListKey::kSize, false, 0, 10}, kEntries), "c d a b B ");
    EXPECT_EQ(NamesOf({package::ListKey::kSize, true, 0, 10}, kEntries), "B b a d c ");
}

TEST(ListPage, IsCutOutOfTheWholeOrder) {
    EXPECT_EQ(NamesOf({package::ListKey::kSize, false, 1, 2}, kEntries), "d a ");
    EXPECT_EQ(NamesOf({package::ListKey::kSize, true, 3, 9}, kEntries), "d c ");
    EXPECT_EQ(NamesOf({package::ListKey::kSize, false, 5, 1}, kEntries), "");
    EXPECT_EQ(NamesOf({package::ListKey::kSize, false, 0, 0}, kEntries), "");
    EXPECT_EQ(NamesOf({package::ListKey::kSize, false, 0, 1}, {}), "");
}

TEST(ListPage, IsTheSameWhateverTheOrderInWhichEntriesCome) {
    std::vector<ListedEntry> entries;
    for (int number = 0; number < 500; ++number) {
        entries.push_back({std::to_string(number), number % 7});
    }
    const ListOrder order{package::ListKey::kTime, false, 120, 30};
    const std::string expected = NamesOf(order, entries);
    EXPECT_EQ(std::count(expected.begin(), expected.end(), ' '), 30);
    std::mt19937 random(1);
    for (int round = 0; round < 20; ++round) {
        std::shuffle(entries.begin(), entries.end(), random);
        EXPECT_EQ(NamesOf(order, entries), expected);
    }
}

}  // namespace
