#include <gtest/gtest.h>

#include "../../packages/ZOVA.Storage.File/Caller.h"
#include "../../packages/ZOVA.Storage.File/SharedFolders.h"
#include "Call.h"
#include "FakeUserDatabase.h"
#include "OwnDeviceFolder.h"

namespace {

constexpr char kTable[] = "shared-folders.json";
constexpr char kGood[] = R"({"folders": [
    {"name": "photos", "path": "/v/photos", "read": {"groups": ["family"]}, "write": {"users": ["alice"]}},
    {"name": "books", "path": "/v/books", "read": {"users": ["alice", "bob"], "groups": []}},
    {"name": "none", "path": "/v/none"}]})";

TEST(SharedFolders, AreReadAsTheTableHasThem) {
    const auto folders = package::ParseSharedFolders(Parse(kGood));
    ASSERT_TRUE(folders);
    ASSERT_EQ(folders->size(), 3U);
    EXPECT_EQ((*folders)[0].name, "photos");
    EXPECT_EQ((*folders)[0].path, "/v/photos");
    EXPECT_EQ((*folders)[0].read.groups, std::vector<std::string>{"family"});
    EXPECT_EQ((*folders)[0].write.users, std::vector<std::string>{"alice"});
    EXPECT_TRUE((*folders)[2].read.users.empty());
    EXPECT_TRUE(package::ParseSharedFolders(Parse(R"({"folders":[]})")));
}

TEST(SharedFolders, TableOfAnotherFormIsNone) {
    const auto with = [](const std::string& entry) { return R"({"folders":[)" + entry + "]}"; };
    const std::string good = R"({"name":"a","path":"/a"})";
    const std::string long65(65, 'n');
    for (const std::string& bad : {std::string("null"),
                                   std::string("[]"),
                                   std::string("7"),
                                   std::string("{}"),
                                   std::string(R"({"folders":null})"),
                                   std::string(R"({"folders":{}})"),
                                   std::string(R"({"folders":[],"x":1})"),
                                   with("null"),
                                   with("7"),
                                   with("{}"),
                                   with(R"({"name":"a"})"),
                                   with(R"({"path":"/a"})"),
                                   with(R"({"name":7,"path":"/a"})"),
                                   with(R"({"name":"","path":"/a"})"),
                                   with(R"({"name":"a/b","path":"/a"})"),
                                   with(R"({"name":"..","path":"/a"})"),
                                   with(R"({"name":")" + long65 + R"(","path":"/a"})"),
                                   with(R"({"name":"a","path":"/"})"),
                                   with(R"({"name":"a","path":"a"})"),
                                   with(R"({"name":"a","path":"/a/"})"),
                                   with(R"({"name":"a","path":"/a/../b"})"),
                                   with(R"({"name":"a","path":"/a\u0000"})"),
                                   with(R"({"name":"a","path":"/a","more":1})"),
                                   with(R"({"name":"a","path":"/a","read":["u"]})"),
                                   with(R"({"name":"a","path":"/a","read":{"user":["u"]}})"),
                                   with(R"({"name":"a","path":"/a","read":{"users":"u"}})"),
                                   with(R"({"name":"a","path":"/a","write":{"users":[7]}})"),
                                   with(R"({"name":"a","path":"/a","write":{"users":[""]}})"),
                                   with(R"({"name":"a","path":"/a","write":{"users":["u\u0000"]}})"),
                                   with(good + "," + good),
                                   with(good + R"(,{"name":"a","path":"/b"})"),
                                   with(good + R"(,{"name":"b","path":"/a/b"})"),
                                   with(R"({"name":"b","path":"/a/b"},)" + good)}) {
        EXPECT_FALSE(package::ParseSharedFolders(Parse(bad))) << bad;
    }
    EXPECT_TRUE(package::ParseSharedFolders(Parse(with(good + R"(,{"name":"b","path":"/ab"})"))));
}

TEST(SharedFolders, TableAndListsHaveLimits) {
    Json::Value table(Json::objectValue);
    for (int at = 0; at < 65; ++at) {
        Json::Value folder(Json::objectValue);
        folder["name"] = "n" + std::to_string(at);
        folder["path"] = "/n" + std::to_string(at);
        table["folders"].append(folder);
    }
    EXPECT_FALSE(package::ParseSharedFolders(table));
    table["folders"].resize(64);
    EXPECT_TRUE(package::ParseSharedFolders(table));
    for (int at = 0; at < 65; ++at) {
        table["folders"][0]["read"]["users"].append("u");
    }
    EXPECT_FALSE(package::ParseSharedFolders(table));
}

// ---- the folders of an account ----

class Callers : public testing::Test {
protected:
    Callers() {
        fake.users = {{"alice", 1001, 1001, "", "/home/alice", ""},
                      {"bob", 1002, 1002, "", "/home/bob", ""},
                      {"root", 0, 0, "", "/root", ""},
                      {"homeless", 1003, 1003, "", "/", ""},
                      {"odd", 1004, 1004, "", "relative/../x", ""}};
        fake.groups = {{50, "family"}};
        fake.memberships["bob"] = {50};
    }

    /** "name:path" and "+" for those that may be written, or why there are none. */
    static std::string FoldersOf(const std::string& user) {
        package::Caller caller;
        if (!package::FindCaller(user, caller)) {
            return "nobody";
        }
        std::string told = caller.isTableGood ? "" : "no table;";
        for (const package::CallerFolder& folder : caller.folders) {
            told += folder.name + ":" + folder.path + (folder.writable ? "+ " : " ");
        }
        return told;
    }

    OwnDeviceFolder folder;
    FakeUserDatabase& fake = FakeUserDatabase::Renew();
};

TEST_F(Callers, HaveTheirHomeAndWhatTheTableGivesThemOrTheirGroups) {
    folder.Put(kTable, kGood);
    EXPECT_EQ(FoldersOf("alice"), "home:/home/alice+ photos:/v/photos+ books:/v/books ");
    EXPECT_EQ(FoldersOf("bob"), "home:/home/bob+ photos:/v/photos books:/v/books ");
}

TEST_F(Callers, HaveTheirHomeAloneWithoutATable) {
    EXPECT_EQ(FoldersOf("alice"), "home:/home/alice+ ");
    folder.Make();
    EXPECT_EQ(FoldersOf("alice"), "home:/home/alice+ ");
}

TEST_F(Callers, HaveNoHomeThatIsNoFolderOfTheirOwn) {
    EXPECT_EQ(FoldersOf("homeless"), "");
    EXPECT_EQ(FoldersOf("odd"), "");
}

TEST_F(Callers, AreNeverRootOrUnknown) {
    EXPECT_EQ(FoldersOf("root"), "nobody");
    EXPECT_EQ(FoldersOf("nobody-knows"), "nobody");
    EXPECT_EQ(FoldersOf(""), "nobody");
    EXPECT_EQ(FoldersOf(std::string("alice\0", 6)), "nobody");
}

TEST_F(Callers, HaveTheirHomeAloneWhereTheTableCannotBeUsed) {
    for (const auto& [content, mode] : {std::pair<std::string, unsigned int>{"{", 0600},
                                        {"", 0600},
                                        {"{}", 0600},
                                        {kGood, 0640},
                                        {kGood, 0602},
                                        {std::string(300 << 10, ' ') + kGood, 0600}}) {
        folder.Put(kTable, content, mode);
        EXPECT_EQ(FoldersOf("alice"), "no table;home:/home/alice+ ");
    }
    folder.Put(kTable, kGood);
    folder.Make(0755);
    EXPECT_EQ(FoldersOf("alice"), "no table;home:/home/alice+ ");
}

}  // namespace
