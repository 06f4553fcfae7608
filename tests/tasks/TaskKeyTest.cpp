#include "taskmanager/TaskKey.h"

#include <gtest/gtest.h>

#include "common/Hex.h"

using reference::IsTaskOwner;
using reference::IsTaskPrefix;
using reference::KeyOfTaskFile;
using reference::MakeTaskKey;

namespace {

struct TextRow {
    const char* name;
    std::string text;
    bool good;
};

std::string NameOf(const ::testing::TestParamInfo<TextRow>& row) {
    return row.param.name;
}

class TaskOwner : public ::testing::TestWithParam<TextRow> {};
class TaskId : public ::testing::TestWithParam<TextRow> {};
class TaskPrefix : public ::testing::TestWithParam<TextRow> {};

}  // namespace

TEST_P(TaskOwner, NamesATaskOnlyIfItFits) {
    EXPECT_EQ(IsTaskOwner(GetParam().text), GetParam().good);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, TaskOwner,
    ::testing::Values(TextRow{"User", "alice", true}, TextRow{"DomainUser", "DOM\\alice", true},
                      TextRow{"MailName", "alice@example.org", true}, TextRow{"Umlauts", "j\xc3\xb6rg", true},
                      TextRow{"Administrators", "@administrators", true}, TextRow{"Users", "@users", true},
                      TextRow{"Longest", std::string(80, 'a'), true}, TextRow{"TooLong", std::string(81, 'a'), false},
                      TextRow{"Empty", "", false}, TextRow{"UnknownGroup", "@others", false},
                      TextRow{"GroupWithMore", "@users2", false}, TextRow{"Slash", "a/b", false},
                      TextRow{"Newline", "a\nb", false}, TextRow{"Nul", std::string("a\0b", 3), false},
                      TextRow{"Delete", "a\x7f", false}),
    NameOf);

TEST_P(TaskId, NamesATaskOnlyIfItFits) {
    EXPECT_EQ(MakeTaskKey("alice", GetParam().text.c_str()).has_value(), GetParam().good);
    EXPECT_EQ(KeyOfTaskFile(reference::HexText("alice") + "." + GetParam().text).has_value(), GetParam().good);
}

INSTANTIATE_TEST_SUITE_P(Rows, TaskId,
                         ::testing::Values(TextRow{"Hex", "0123abcd", true}, TextRow{"Prefixed", "search-01.a_b", true},
                                           TextRow{"Longest", std::string(64, 'a'), true},
                                           TextRow{"TooLong", std::string(65, 'a'), false}, TextRow{"Empty", "", false},
                                           TextRow{"Above", "..", false}, TextRow{"Here", ".", false},
                                           TextRow{"Slash", "a/b", false},
                                           TextRow{"Climbing", "../../etc/passwd", false},
                                           TextRow{"Newline", "a\nb", false}, TextRow{"Blank", "a b", false},
                                           TextRow{"Star", "a*", false}, TextRow{"Dash", "-a", false},
                                           TextRow{"NotAscii", "\xc3\xa4", false}, TextRow{"Percent", "%2e", false}),
                         NameOf);

TEST_P(TaskPrefix, BeginsAnIdOnlyIfItFits) {
    EXPECT_EQ(IsTaskPrefix(GetParam().text), GetParam().good);
}

INSTANTIATE_TEST_SUITE_P(Rows, TaskPrefix,
                         ::testing::Values(TextRow{"Empty", "", true}, TextRow{"Word", "copy-", true},
                                           TextRow{"Longest", std::string(32, 'a'), true},
                                           TextRow{"TooLong", std::string(33, 'a'), false},
                                           TextRow{"Slash", "a/", false}, TextRow{"Above", "..", false}),
                         NameOf);

TEST(TaskFileName, StandsForTheKeyThatMadeIt) {
    const auto key = MakeTaskKey("DOM\\alice.b", "copy.1-2");
    ASSERT_TRUE(key);
    const auto read = KeyOfTaskFile(key->FileName());
    ASSERT_TRUE(read);
    EXPECT_EQ(read->owner, "DOM\\alice.b");
    EXPECT_EQ(read->id, "copy.1-2");
    EXPECT_EQ(reference::IdOfTaskFile(key->FileName(), "DOM\\alice.b"), "copy.1-2");
    EXPECT_EQ(reference::IdOfTaskFile(key->FileName(), "DOM\\alice"), "");
}

TEST(TaskFileName, FitsAFileSystemAtItsLongest) {
    const auto key = MakeTaskKey(std::string(80, 'o').c_str(), std::string(64, 'i').c_str());
    ASSERT_TRUE(key);
    EXPECT_LE(key->FileName().size(), 255u);
}

TEST(TaskFileName, IsRefusedInAnyOtherForm) {
    for (const char* file : {"", ".", "..", "a", ".a", "6.a", "6g.a", "616C696365.a", "2f.a", "61.", "61", ".new-01"}) {
        EXPECT_FALSE(KeyOfTaskFile(file)) << file;
    }
}

TEST(TaskKey, IsNoneForNullPointers) {
    EXPECT_FALSE(MakeTaskKey(nullptr, "a"));
    EXPECT_FALSE(MakeTaskKey("a", nullptr));
}
