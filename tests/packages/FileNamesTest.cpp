#include <gtest/gtest.h>
#include <sys/stat.h>

#include "../../packages/ZOVA.Storage.File/Attachment.h"
#include "../../packages/ZOVA.Storage.File/ClientPath.h"
#include "../../packages/ZOVA.Storage.File/EntryJson.h"
#include "Call.h"

namespace {

using package::EntryJson;
using package::EntryView;

TEST(ClientPath, IsAbsoluteAndHasNoPartThatLeadsElsewhere) {
    for (const std::string& good :
         {std::string("/"), std::string("/a"), std::string("/a/b c/\xff"), std::string("/..."), std::string("/.a/..b"),
          "/" + std::string(255, 'n'), std::string("/a\nb")}) {
        EXPECT_TRUE(package::IsClientPath(good)) << good;
    }
    for (const std::string& bad :
         {std::string(), std::string("a"), std::string("a/b"), std::string("//"), std::string("/a/"),
          std::string("/a//b"), std::string("/."), std::string("/.."), std::string("/a/./b"), std::string("/a/../b"),
          std::string("/a/.."), std::string("/a\0b", 4), std::string("\0", 1), "/" + std::string(256, 'n')}) {
        EXPECT_FALSE(package::IsClientPath(bad)) << bad;
    }
}

TEST(ClientPath, IsAtMostAsLongAsTheKernelTakes) {
    std::string path;
    while (path.size() < 4094) {
        path += "/a";
    }
    EXPECT_TRUE(package::IsClientPath(path + "b"));
    EXPECT_FALSE(package::IsClientPath(path + "bc"));
}

TEST(ClientPath, NewNameIsOnePartOfUtf8WithoutControlBytes) {
    for (const char* good : {"a", " ", "\xC3\xB6", "\xF0\x9F\x98\x80", "-rf", "a\\b", "...", ".hidden", "\"'"}) {
        EXPECT_TRUE(package::IsNewName(good)) << good;
    }
    for (const std::string& bad : {std::string(), std::string("."), std::string(".."), std::string("a/b"),
                                   std::string("/"), std::string("a\nb"), std::string("\x7f"), std::string("a\0b", 3),
                                   std::string("\xff"), std::string("\xC3"), std::string(256, 'n')}) {
        EXPECT_FALSE(package::IsNewName(bad)) << bad;
    }
}

TEST(ClientPath, LiesWithinAFolderByWholeParts) {
    EXPECT_TRUE(package::IsWithin("/a/b", "/a"));
    EXPECT_TRUE(package::IsWithin("/a", "/a"));
    EXPECT_FALSE(package::IsWithin("/ab", "/a"));
    EXPECT_FALSE(package::IsWithin("/", "/a"));
    EXPECT_FALSE(package::IsWithin("/a", "/a/b"));
}

TEST(Attachment, NameIsPlainWhereItCanBeAndWholeBesideItOtherwise) {
    const std::pair<std::string, std::string> rows[] = {
        {"a b.txt", "attachment; filename=\"a b.txt\""},
        {"a\"b\\c%d", "attachment; filename=\"a_b_c_d\"; filename*=UTF-8''a%22b%5Cc%25d"},
        {"\xC3\xB6.txt", "attachment; filename=\"_.txt\"; filename*=UTF-8''%C3%B6.txt"},
        {"a\r\nX: y", "attachment; filename=\"a__X: y\"; filename*=UTF-8''a__X%3A%20y"},
        {std::string("a\0b", 3), "attachment; filename=\"a_b\"; filename*=UTF-8''a_b"},
        {"\xff", "attachment; filename=\"_\"; filename*=UTF-8''%EF%BF%BD"},
    };
    for (const auto& [name, value] : rows) {
        EXPECT_EQ(package::AttachmentNamed(name), value);
    }
}

TEST(EntryJson, TellsTypeSizeAndTimeAndOwnersToAccountsOnly) {
    struct stat status = {};
    status.st_mode = S_IFREG | 04751;
    status.st_size = 1LL << 40;
    status.st_mtime = -5;
    status.st_uid = 4294967294U;
    status.st_gid = 7;
    EXPECT_EQ(Json::toString(EntryJson("/a/b", status, EntryView::kVisitor)),
              R"({"mtime":-5,"name":"b","path":"/a/b","size":1099511627776,"type":"file"})");
    EXPECT_EQ(Json::toString(EntryJson("/a/b", status, EntryView::kAccount)),
              R"({"gid":7,"mode":2537,"mtime":-5,"name":"b","path":"/a/b","size":1099511627776,"type":"file",)"
              R"("uid":4294967294})");
    for (const auto& [mode, type] : {std::pair<mode_t, const char*>{S_IFDIR, "folder"},
                                     {S_IFLNK, "link"},
                                     {S_IFIFO, "other"},
                                     {S_IFSOCK, "other"},
                                     {S_IFBLK, "other"},
                                     {S_IFCHR, "other"}}) {
        status.st_mode = mode;
        const Json::Value entry = EntryJson("/a", status, EntryView::kVisitor);
        EXPECT_EQ(entry["type"].asString(), type);
        EXPECT_FALSE(entry.isMember("size"));
    }
}

TEST(EntryJson, ShowsBytesThatAreNoUtf8TwiceSoThatTheyCanBeAskedFor) {
    const struct stat status = {};
    const Json::Value entry = EntryJson("/\xC3\xB6/\xff\n", status, EntryView::kVisitor);
    EXPECT_EQ(entry["name"].asString(), "\xEF\xBF\xBD\n");
    EXPECT_EQ(entry["name_bytes"].asString(), "%FF%0A");
    EXPECT_EQ(entry["path_bytes"].asString(), "/%C3%B6/%FF%0A");
    EXPECT_FALSE(EntryJson("/\xC3\xB6", status, EntryView::kVisitor).isMember("name_bytes"));
}

}  // namespace
