// The database of sharing links as the framework asks it: look-ups, verdicts, URLs.

#include <fcntl.h>
#include <sys/wait.h>

#include "SharingFixture.h"

using namespace ZOVA::sharing;

namespace {

using Sharing = SharingDevice;

constexpr const char* kUnknownHash = "0123456789abcdef0123456789abcdef";

}  // namespace

TEST_F(Sharing, NamesHeaderAndCookie) {
    EXPECT_STREQ(SZ_X_SHARING_HEADER, "HTTP_X_SHARING_ID");
    EXPECT_STREQ(SZK_SHARING_SID, "sharing_sid");
}

TEST_F(Sharing, IsNotMadeByALookUp) {
    db::SharingDB& database = db::SharingDB::Instance();
    EXPECT_FALSE(database.IsGood());
    record::Entry entry;
    record::Session session;
    record::Token token;
    EXPECT_FALSE(db::EntryDB(database).GetByHash(kUnknownHash, entry));
    EXPECT_FALSE(db::SessionDB(database).GetBySessionId(std::string(64, 'a'), session));
    EXPECT_FALSE(db::TokenDB(database).GetBySessionEntry(session, entry, token));
    EXPECT_EQ(Judge(kUnknownHash), -4);
    EXPECT_FALSE(Exists(InRoot("/var/lib/zova/sharing")));
}

TEST_F(Sharing, LiesInAPrivateFileInAPrivateFolder) {
    Create();
    EXPECT_EQ(ModeOf(InRoot("/var/lib/zova/sharing")), 0700u);
    EXPECT_EQ(ModeOf(DatabaseFile()), 0600u);
    EXPECT_TRUE(db::SharingDB::Instance().IsGood());
}

TEST_F(Sharing, GivesTheRecordsOfAnOpenedLink) {
    const std::string hash = Create(R"({"protect_type": 1, "password": "secret", "match_ip": true})");
    ASSERT_EQ(Open(hash, "secret"), ZOVA_LINK_OK);
    db::SharingDB& database = db::SharingDB::Instance();
    record::Entry entry;
    record::Session session;
    record::Token token;
    ASSERT_TRUE(db::EntryDB(database).GetByHash(hash, entry));
    EXPECT_EQ(entry.get_project_name(), "files");
    EXPECT_EQ(entry.get_protect_type(), 1);
    EXPECT_TRUE(entry.get_enable_match_ip());
    EXPECT_EQ(entry.paths, std::vector<std::string>{Shared()});
    EXPECT_EQ(entry.ownerUid, kAliceUid);
    ASSERT_TRUE(db::SessionDB(database).GetBySessionId(lastSid, session));
    EXPECT_EQ(session.get_timeout(), lastEnd);
    EXPECT_TRUE(db::TokenDB(database).GetBySessionEntry(session, entry, token));
    EXPECT_NE(token.id, 0);
}

TEST_F(Sharing, LeavesAnEmptyRecordWhereNothingIsFound) {
    const std::string hash = Create(R"({"protect_type": 1, "password": "secret"})");
    ASSERT_EQ(Open(hash, "secret"), ZOVA_LINK_OK);
    db::SharingDB& database = db::SharingDB::Instance();
    record::Entry entry;
    record::Session session;
    record::Token token;
    ASSERT_TRUE(db::EntryDB(database).GetByHash(hash, entry));
    ASSERT_TRUE(db::SessionDB(database).GetBySessionId(lastSid, session));
    ASSERT_TRUE(db::TokenDB(database).GetBySessionEntry(session, entry, token));
    EXPECT_FALSE(db::EntryDB(database).GetByHash(kUnknownHash, entry));
    EXPECT_EQ(entry.get_project_name(), "");
    EXPECT_FALSE(db::TokenDB(database).GetBySessionEntry(session, entry, token));
    EXPECT_EQ(token.id, 0);
    EXPECT_FALSE(db::SessionDB(database).GetBySessionId("", session));
    EXPECT_EQ(session.id, 0);
}

TEST_F(Sharing, FindsNothingUnderWhatIsNoHashOrNoSessionId) {
    const std::string hash = Create();
    db::SharingDB& database = db::SharingDB::Instance();
    record::Entry entry;
    record::Session session;
    for (const std::string& bad :
         {std::string(), hash.substr(1), hash + "0", std::string("' OR 1=1 --"), std::string("\0", 1),
          std::string(1 << 20, 'a'), "G" + hash.substr(1), hash + "\n", "\xff\xfe" + hash.substr(2)}) {
        EXPECT_FALSE(db::EntryDB(database).GetByHash(bad, entry));
        EXPECT_FALSE(db::SessionDB(database).GetBySessionId(bad, session));
        EXPECT_EQ(Judge(bad), -4);
    }
}

// ---- verdicts ----

TEST_F(Sharing, JudgesAPublicLinkGoodWithoutASession) {
    const std::string hash = Create();
    EXPECT_EQ(Judge(hash), 1);
    EXPECT_EQ(Judge(hash, "any"), 1);
    EXPECT_EQ(Judge(hash, "", nullptr), 1);
}

TEST_F(Sharing, JudgesAnUnknownLinkMinus4) {
    Create();
    EXPECT_EQ(Judge(kUnknownHash), -4);
    EXPECT_EQ(ZovaSharingIsAuthorized(nullptr), -4);
    const ZovaSharingCredentials none{};
    EXPECT_EQ(ZovaSharingIsAuthorized(&none), -4);
}

TEST_F(Sharing, JudgesALinkThatIsOffOrPastItsEndMinus2) {
    const std::string hash = Create();
    EXPECT_EQ(Update(hash, R"({"enabled": false})"), ZOVA_LINK_OK);
    EXPECT_EQ(Judge(hash), -2);
    EXPECT_EQ(Update(hash, R"({"enabled": true})"), ZOVA_LINK_OK);
    EXPECT_EQ(Judge(hash), 1);
    Run("UPDATE entries SET expires = " + std::to_string(time(nullptr)));
    EXPECT_EQ(Judge(hash), -2);
    Run("UPDATE entries SET expires = 0, created = " + std::to_string(time(nullptr) + 3600));
    EXPECT_EQ(Judge(hash), -2) << "made in the future";
}

TEST_F(Sharing, JudgesALinkWhoseOwnerIsGoneOrLockedMinus2) {
    const std::string hash = Create();
    for (const char* owner : {"owner_name = 'ghost'", "owner_uid = 4711", "owner_name = 'locked', owner_uid = 61004",
                              "owner_name = 'root', owner_uid = 0"}) {
        Run("UPDATE entries SET owner_name = 'alice', owner_uid = 61001");
        EXPECT_EQ(Judge(hash), 1);
        Run(std::string("UPDATE entries SET ") + owner);
        EXPECT_EQ(Judge(hash), -2) << owner;
    }
}

TEST_F(Sharing, JudgesAProtectedLinkWithoutAKnownSessionMinus5) {
    for (const char* fields :
         {R"({"protect_type": 1, "password": "secret"})", R"({"protect_type": 2, "users": ["boss"]})",
          R"({"match_ip": true})", R"({"visit_limit": 3})"}) {
        const std::string hash = Create(fields);
        EXPECT_EQ(Judge(hash), -5) << fields;
        EXPECT_EQ(Judge(hash, std::string(64, 'a')), -5) << fields;
        EXPECT_EQ(Judge(hash, "' OR 1=1 --"), -5) << fields;
    }
}

TEST_F(Sharing, JudgesASessionGoodOnItsOwnLinkAloneAndMinus7OnAnother) {
    const std::string first = Create(R"({"protect_type": 1, "password": "one"})");
    const std::string second = Create(R"({"protect_type": 1, "password": "two"})");
    ASSERT_EQ(Open(first, "one"), ZOVA_LINK_OK);
    const std::string sid = lastSid;
    EXPECT_EQ(Judge(first, sid), 1);
    EXPECT_EQ(Judge(second, sid), -7);
    EXPECT_EQ(Judge(first, sid, "198.51.100.1"), 1) << "not bound to an address";
}

TEST_F(Sharing, JudgesASessionThatHasEndedMinus1) {
    const std::string hash = Create(R"({"protect_type": 1, "password": "one"})");
    ASSERT_EQ(Open(hash, "one"), ZOVA_LINK_OK);
    Run("UPDATE sessions SET expires = " + std::to_string(time(nullptr)));
    EXPECT_EQ(Judge(hash, lastSid), -1);
    const std::string later = std::to_string(time(nullptr) + 3600);
    Run("UPDATE sessions SET expires = " + later + " + 9, created = " + later);
    EXPECT_EQ(Judge(hash, lastSid), -1) << "made in the future";
}

TEST_F(Sharing, JudgesAnotherAddressMinus8) {
    const std::string listed = Create(R"({"addresses": ["192.0.2.0/24", "2001:db8::1"]})");
    EXPECT_EQ(Judge(listed), 1);
    EXPECT_EQ(Judge(listed, "", "2001:db8::1"), 1);
    for (const char* other : {"198.51.100.1", "2001:db8::2", "", "nonsense"}) {
        EXPECT_EQ(Judge(listed, "", other), -8) << other;
    }
    EXPECT_EQ(Judge(listed, "", nullptr), -8);
    const std::string matched = Create(R"({"match_ip": true})");
    ASSERT_EQ(Open(matched), ZOVA_LINK_OK);
    EXPECT_EQ(Judge(matched, lastSid), 1);
    EXPECT_EQ(Judge(matched, lastSid, "192.0.2.8"), -8);
    EXPECT_EQ(Judge(matched, lastSid, nullptr), -8);
}

TEST_F(Sharing, JudgesTheSessionOfAUserWhoMayNotUseTheLinkAnyMoreMinus7) {
    const std::string hash = Create(R"({"protect_type": 2, "users": ["boss", "alice"]})");
    ASSERT_EQ(Open(hash, kPassword, "boss"), ZOVA_LINK_OK);
    EXPECT_EQ(Judge(hash, lastSid), 1);
    Run("UPDATE entries SET users = '[\"alice\"]'");
    EXPECT_EQ(Judge(hash, lastSid), -7);
    Run("UPDATE entries SET users = '[\"boss\",\"locked\"]'");
    EXPECT_EQ(Judge(hash, lastSid), 1);
    Run("UPDATE sessions SET user_name = 'locked', uid = 61004");
    EXPECT_EQ(Judge(hash, lastSid), -7);
}

TEST_F(Sharing, JudgesAUsedUpLinkMinus2ButKeepsTheSessionsThatUsedIt) {
    const std::string hash = Create(R"({"visit_limit": 1})");
    ASSERT_EQ(Open(hash), ZOVA_LINK_OK);
    EXPECT_EQ(Judge(hash, lastSid), 1);
    EXPECT_EQ(Judge(hash), -2);
}

// ---- a database that cannot be used ----

TEST_F(Sharing, ThatCannotBeUsedIsNotGoodAndJudgesMinus6) {
    const std::string hash = Create();
    const std::string good = ReadWholeFile(DatabaseFile());
    const auto isBad = [&](const char* how) {
        EXPECT_FALSE(db::SharingDB::Instance().IsGood()) << how;
        EXPECT_EQ(Judge(hash), -6) << how;
        const Json::Value fields = Fields();
        Json::Value made;
        EXPECT_EQ(ZovaLinkCreate("alice", &fields, &made), ZOVA_LINK_FAILED) << how;
        EXPECT_EQ(Open(hash), ZOVA_LINK_FAILED) << how;
    };
    WriteFile(DatabaseFile(), "no database, though it is long enough to be taken for the beginning of one");
    isBad("other bytes");
    WriteFile(DatabaseFile(), good);
    Run("PRAGMA user_version = 2");
    isBad("a later version");
    WriteFile(DatabaseFile(), good);
    ASSERT_EQ(chmod(DatabaseFile().c_str(), 0644), 0);
    isBad("readable by others");
    ASSERT_EQ(chmod(DatabaseFile().c_str(), 0600), 0);
    GiveTo(DatabaseFile(), kAliceUid);
    isBad("somebody else's");
    GiveTo(DatabaseFile(), 0);
    EXPECT_EQ(Judge(hash), 1);
    ASSERT_EQ(rename(DatabaseFile().c_str(), (DatabaseFile() + ".moved").c_str()), 0);
    ASSERT_EQ(symlink("sharing.db.moved", DatabaseFile().c_str()), 0);
    isBad("a link");
}

TEST_F(Sharing, WithARowThatIsNotTheLibrarysJudgesMinus6) {
    const std::string hash = Create();
    Run("UPDATE entries SET paths = 'no list'");
    EXPECT_EQ(Judge(hash), -6);
    record::Entry entry;
    EXPECT_FALSE(db::EntryDB(db::SharingDB::Instance()).GetByHash(hash, entry));
}

TEST_F(Sharing, CannotBeAskedWithoutRoot) {
    const std::string hash = Create();
    EXPECT_EQ(StatusOfChild([&] { return setresuid(kAliceUid, kAliceUid, kAliceUid) == 0 ? -Judge(hash) : 99; }), 6);
}

TEST_F(Sharing, IsAskedByAChildAndItsParentAtOnce) {
    const std::string hash = Create(R"({"visit_limit": 1000})");
    constexpr int kEach = 8;
    std::vector<pid_t> children;
    for (int child = 0; child < 3; ++child) {
        children.push_back(fork());
        if (children.back() == 0) {
            int good = 0;
            for (int visit = 0; visit < kEach; ++visit) {
                good += Open(hash) == ZOVA_LINK_OK && Judge(hash, lastSid) == 1 ? 1 : 0;
            }
            _exit(good == kEach ? 0 : 1);
        }
        EXPECT_EQ(Judge(hash), -5);
    }
    for (const pid_t child : children) {
        int status = 0;
        ASSERT_EQ(waitpid(child, &status, 0), child);
        EXPECT_EQ(status, 0);
    }
    Json::Value link;
    ASSERT_EQ(ZovaLinkGet("alice", hash.c_str(), &link), ZOVA_LINK_OK);
    EXPECT_EQ(link["visits"].asInt(), 3 * kEach);
}

TEST_F(Sharing, LeavesNoDescriptorOpen) {
    const auto next = [] {
        const int descriptor = open("/dev/null", O_RDONLY | O_CLOEXEC);
        close(descriptor);
        return descriptor;
    };
    const std::string hash = Create(R"({"visit_limit": 10})");
    const int before = next();
    ASSERT_EQ(Open(hash), ZOVA_LINK_OK);
    EXPECT_EQ(Judge(hash, lastSid), 1);
    EXPECT_TRUE(db::SharingDB::Instance().IsGood());
    EXPECT_EQ(next(), before);
}

// ---- URLs ----

namespace {

struct UrlCase {
    const char* name;
    const char* host;
    int port;
    bool https;
    const char* path;
    const char* app;
    const char* url;
    int type;
};

class SharingUrl : public ::testing::TestWithParam<UrlCase> {};

}  // namespace

TEST_P(SharingUrl, IsBuiltOnlyFromWhatCanBePartOfOne) {
    const UrlCase& row = GetParam();
    std::string url = "before";
    _tag_SHARING_URL_TYPE type = SHARING_URL_REWRITTEN;
    EXPECT_EQ(GetSharingURL(row.host, row.port, row.https, row.path, row.app, url, type), *row.url != '\0');
    EXPECT_EQ(url, row.url);
    EXPECT_EQ(type, row.type);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, SharingUrl,
    ::testing::Values(UrlCase{"UsualPort", "nas", 443, true, "/webapi/", "", "https://nas/sharing/", 1},
                      UrlCase{"OtherPort", "nas", 5001, true, "/webapi/", "", "https://nas:5001/sharing/", 1},
                      UrlCase{"UnknownPort", "nas", 0, false, "", "", "http://nas/sharing/", 1},
                      UrlCase{"Version6", "[2001:db8::1]", 80, false, "/", "", "http://[2001:db8::1]/sharing/", 1},
                      UrlCase{"DeeperFolder", "nas", 80, false, "/a/b/webapi/", "", "http://nas/a/b/sharing/", 1},
                      UrlCase{"Rewritten", "nas", 80, false, "/webapi/", "photo", "http://nas/photo/sharing/", 2},
                      UrlCase{"NoHost", "", 80, false, "/webapi/", "", "", 0},
                      UrlCase{"HostWithMarkup", "a\"><script>", 80, false, "/", "", "", 0},
                      UrlCase{"HostWithUser", "user@evil", 80, false, "/", "", "", 0},
                      UrlCase{"HostWithLineEnd", "nas\r\nX: y", 80, false, "/", "", "", 0},
                      UrlCase{"OpenBracket", "[::1", 80, false, "/", "", "", 0},
                      UrlCase{"PortTooHigh", "nas", 65536, false, "/", "", "", 0},
                      UrlCase{"NegativePort", "nas", -1, false, "/", "", "", 0},
                      UrlCase{"PathWithDots", "nas", 80, false, "/a/../b/", "", "", 0},
                      UrlCase{"TwoSlashes", "nas", 80, false, "//evil/", "", "", 0},
                      UrlCase{"RelativePath", "nas", 80, false, "webapi/", "", "", 0},
                      UrlCase{"AppWithSlash", "nas", 80, false, "/", "a/b", "", 0},
                      UrlCase{"AppOfDots", "nas", 80, false, "/", "..", "", 0}),
    [](const auto& row) { return std::string(row.param.name); });
