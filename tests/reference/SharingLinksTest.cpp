// Operations on sharing links: what owners may make of them, and what visitors have to bring.

#include <fcntl.h>

#include "SharingFixture.h"
#include "common/UniqueFd.h"

namespace {

using SharingLinks = SharingDevice;

std::string TextOf(const Json::Value& value) {
    return reference::WriteJson(value);
}

}  // namespace

// ---- fields ----

TEST_F(SharingLinks, AreGivenBackWithWhatTheyWereMadeWithButThePassword) {
    const std::string hash =
        Create(R"({"protect_type": 1, "password": "secret", "addresses": ["192.0.2.0/24"], "visit_limit": 7,
                   "match_ip": true, "enabled": false})");
    EXPECT_EQ(hash.size(), 32u);
    EXPECT_GE(hash.front(), 'a');
    Json::Value link;
    ASSERT_EQ(ZovaLinkGet("alice", hash.c_str(), &link), ZOVA_LINK_OK);
    EXPECT_LE(time(nullptr) - link["created"].asInt64(), 60);
    link.removeMember("created");
    EXPECT_EQ(TextOf(link), R"({"addresses":["192.0.2.0/24"],"enabled":false,"expires":0,"hash":")" + hash +
                                R"(","match_ip":true,"paths":[")" + Shared() +
                                R"("],"project":"files","protect_type":1,"users":[],"visit_limit":7,"visits":0})");
    EXPECT_EQ(ReadWholeFile(DatabaseFile()).find("secret"), std::string::npos);
}

TEST_F(SharingLinks, AreRefusedWithFieldsThatAreNotGood) {
    const std::string now = std::to_string(time(nullptr));
    const std::pair<std::string, int> cases[] = {
        {R"({"more": 1})", ZOVA_LINK_BAD_FIELD},
        {R"({"enabled": 1})", ZOVA_LINK_BAD_FIELD},
        {R"({"project": ""})", ZOVA_LINK_BAD_PROJECT},
        {R"({"project": 7})", ZOVA_LINK_BAD_PROJECT},
        {R"({"project": "../x"})", ZOVA_LINK_BAD_PROJECT},
        {R"({"project": ".x"})", ZOVA_LINK_BAD_PROJECT},
        {R"({"project": "a/b"})", ZOVA_LINK_BAD_PROJECT},
        {R"({"project": "a\u0000b"})", ZOVA_LINK_BAD_PROJECT},
        {R"({"project": ")" + std::string(65, 'a') + R"("})", ZOVA_LINK_BAD_PROJECT},
        {R"({"paths": []})", ZOVA_LINK_BAD_PATHS},
        {R"({"paths": "/"})", ZOVA_LINK_BAD_PATHS},
        {R"({"paths": ["/"]})", ZOVA_LINK_BAD_PATHS},
        {R"({"paths": [7]})", ZOVA_LINK_BAD_PATHS},
        {R"({"paths": ["/etc/passwd"]})", ZOVA_LINK_BAD_PATHS},
        {R"({"paths": [")" + Shared() + R"(/../album"]})", ZOVA_LINK_BAD_PATHS},
        {R"({"paths": [")" + Shared() + R"(/"]})", ZOVA_LINK_BAD_PATHS},
        {R"({"paths": [")" + Shared() + R"(/none"]})", ZOVA_LINK_BAD_PATHS},
        {R"({"paths": [")" + Shared() + R"(\u0000"]})", ZOVA_LINK_BAD_PATHS},
        {R"({"protect_type": 3})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"protect_type": -1})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"protect_type": "1"})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"protect_type": 1})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"password": "secret"})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"protect_type": 1, "password": ""})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"protect_type": 1, "password": 5})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"protect_type": 1, "password": "a\u0000b"})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"protect_type": 1, "password": ")" + std::string(257, 'a') + R"("})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"protect_type": 1, "password": "a", "users": ["boss"]})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"protect_type": 2})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"protect_type": 2, "users": []})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"protect_type": 2, "users": ["ghost"]})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"protect_type": 2, "users": ["root"]})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"protect_type": 2, "users": ["boss\u0000"]})", ZOVA_LINK_BAD_PROTECTION},
        {R"({"addresses": "192.0.2.1"})", ZOVA_LINK_BAD_ADDRESSES},
        {R"({"addresses": ["host"]})", ZOVA_LINK_BAD_ADDRESSES},
        {R"({"addresses": ["192.0.2.1/33"]})", ZOVA_LINK_BAD_ADDRESSES},
        {R"({"addresses": ["192.0.2.1,0.0.0.0/0"]})", ZOVA_LINK_BAD_ADDRESSES},
        {R"({"match_ip": "yes"})", ZOVA_LINK_BAD_ADDRESSES},
        {R"({"expires": )" + now + "}", ZOVA_LINK_BAD_TIME},
        {R"({"expires": -1})", ZOVA_LINK_BAD_TIME},
        {R"({"expires": 1e300})", ZOVA_LINK_BAD_TIME},
        {R"({"expires": "0"})", ZOVA_LINK_BAD_TIME},
        {R"({"expires": 9223372036854775807})", ZOVA_LINK_BAD_TIME},
        {R"({"visit_limit": -1})", ZOVA_LINK_BAD_LIMIT},
        {R"({"visit_limit": 1000001})", ZOVA_LINK_BAD_LIMIT},
        {R"({"visit_limit": "1"})", ZOVA_LINK_BAD_LIMIT},
    };
    for (const auto& [more, result] : cases) {
        const Json::Value fields = Fields(more);
        Json::Value made("untouched");
        EXPECT_EQ(ZovaLinkCreate("alice", &fields, &made), result) << more;
        EXPECT_EQ(made, "untouched");
    }
    EXPECT_FALSE(Exists(DatabaseFile()));
    for (const Json::Value& fields : {Json::Value(), Json::Value(Json::arrayValue), Json::Value("x")}) {
        Json::Value made;
        EXPECT_EQ(ZovaLinkCreate("alice", &fields, &made), ZOVA_LINK_BAD_FIELD);
    }
}

TEST_F(SharingLinks, ShareOnlyWhatBelongsToTheirOwner) {
    const std::string other = InRoot("/scratch/others");
    WriteFile(other + "/file", "x");
    ASSERT_EQ(symlink(other.c_str(), (Shared() + "/way").c_str()), 0);
    ASSERT_EQ(link((other + "/file").c_str(), (Shared() + "/hard").c_str()), 0);
    ASSERT_EQ(mkfifo((Shared() + "/pipe").c_str(), 0600), 0);
    GiveTo(Shared() + "/way", kAliceUid);
    GiveTo(Shared() + "/pipe", kAliceUid);
    for (const std::string& path :
         {other, Shared() + "/way", Shared() + "/way/file", Shared() + "/hard", Shared() + "/pipe", other + "/file"}) {
        Json::Value fields = Fields();
        fields["paths"] = Json::Value(Json::arrayValue);
        fields["paths"].append(path);
        Json::Value made;
        EXPECT_EQ(ZovaLinkCreate("alice", &fields, &made), ZOVA_LINK_BAD_PATHS) << path;
    }
}

TEST_F(SharingLinks, AreNotMadeForAccountsThatMayNotLogIn) {
    const Json::Value fields = Fields();
    Json::Value made;
    for (const char* owner : {"root", "otherroot", "system", "locked", "expired", "ghost", ""}) {
        EXPECT_EQ(ZovaLinkCreate(owner, &fields, &made), ZOVA_LINK_NO_USER) << owner;
        EXPECT_EQ(ZovaLinkList(owner, &made), ZOVA_LINK_NO_USER) << owner;
    }
    EXPECT_EQ(ZovaLinkCreate(nullptr, &fields, &made), ZOVA_LINK_NO_USER);
}

// ---- owners ----

TEST_F(SharingLinks, AreSeenAndChangedByTheirOwnerAlone) {
    Json::Value list;
    EXPECT_EQ(ZovaLinkList("alice", &list), ZOVA_LINK_OK);
    EXPECT_EQ(TextOf(list), "[]");
    const std::string first = Create();
    const std::string second = Create();
    EXPECT_NE(first, second);
    ASSERT_EQ(ZovaLinkList("alice", &list), ZOVA_LINK_OK);
    ASSERT_EQ(list.size(), 2u);
    EXPECT_EQ(list[0]["hash"].asString(), first);
    ASSERT_EQ(ZovaLinkList("boss", &list), ZOVA_LINK_OK);
    EXPECT_EQ(list.size(), 0u);
    Json::Value other;
    const Json::Value change = Json::Value(Json::objectValue);
    EXPECT_EQ(ZovaLinkGet("boss", first.c_str(), &other), ZOVA_LINK_UNKNOWN);
    EXPECT_EQ(ZovaLinkUpdate("boss", first.c_str(), &change), ZOVA_LINK_UNKNOWN);
    EXPECT_EQ(ZovaLinkDelete("boss", first.c_str()), ZOVA_LINK_UNKNOWN);
    EXPECT_EQ(ZovaLinkDelete("alice", "' OR 1=1 --"), ZOVA_LINK_UNKNOWN);
    EXPECT_EQ(ZovaLinkDelete("alice", first.c_str()), ZOVA_LINK_OK);
    EXPECT_EQ(ZovaLinkDelete("alice", first.c_str()), ZOVA_LINK_UNKNOWN);
    EXPECT_EQ(Judge(first), -4);
    EXPECT_EQ(Judge(second), 1);
}

TEST_F(SharingLinks, KeepWhatAnUpdateDoesNotName) {
    const std::string hash = Create(R"({"protect_type": 1, "password": "one", "visit_limit": 9})");
    EXPECT_EQ(Update(hash, R"({"addresses": ["192.0.2.7"]})"), ZOVA_LINK_OK);
    EXPECT_EQ(Open(hash, "one"), ZOVA_LINK_OK);
    EXPECT_EQ(Update(hash, R"({"project": "other"})"), ZOVA_LINK_BAD_FIELD);
    EXPECT_EQ(Update(hash, R"({"protect_type": 2})"), ZOVA_LINK_BAD_PROTECTION);
    EXPECT_EQ(Update(hash, R"({"users": ["boss"]})"), ZOVA_LINK_BAD_PROTECTION);
    EXPECT_EQ(Update(hash, R"({"paths": ["/etc/passwd"]})"), ZOVA_LINK_BAD_PATHS);
    EXPECT_EQ(Judge(hash, lastSid), 1) << "a refused change leaves the sessions";
    EXPECT_EQ(Update(hash, R"({"protect_type": 0})"), ZOVA_LINK_OK);
    Json::Value link;
    ASSERT_EQ(ZovaLinkGet("alice", hash.c_str(), &link), ZOVA_LINK_OK);
    EXPECT_EQ(link["visit_limit"].asInt(), 9);
    EXPECT_EQ(TextOf(link["addresses"]), R"(["192.0.2.7"])");
    EXPECT_EQ(Update(hash, R"({"protect_type": 1})"), ZOVA_LINK_BAD_PROTECTION) << "the old password is gone";
}

TEST_F(SharingLinks, EndTheirSessionsWithAChangeOfAccessAndNotWithAnother) {
    const std::string hash = Create(R"({"protect_type": 1, "password": "one"})");
    ASSERT_EQ(Open(hash, "one"), ZOVA_LINK_OK);
    EXPECT_EQ(Update(hash, R"({"visit_limit": 5, "expires": 0, "enabled": true, "addresses": []})"), ZOVA_LINK_OK);
    EXPECT_EQ(Judge(hash, lastSid), 1);
    EXPECT_EQ(Update(hash, R"({"password": "two"})"), ZOVA_LINK_OK);
    EXPECT_EQ(Judge(hash, lastSid), -7);
    EXPECT_EQ(Open(hash, "one"), ZOVA_LINK_REFUSED);
    EXPECT_EQ(Open(hash, "two"), ZOVA_LINK_OK);
}

TEST_F(SharingLinks, AreAThousandOfAnOwnersAtMost) {
    const std::string hash = Create();
    Run("WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 999) INSERT INTO entries "
        "(hash, owner_uid, owner_name, project, paths, protect_type, password, users, addresses, match_ip, created, "
        "expires, visits, visit_limit, enabled) SELECT 'h' || i, owner_uid, owner_name, project, paths, 0, '', '[]', "
        "'', 0, created, 0, 0, 0, 1 FROM entries, n");
    const Json::Value fields = Fields();
    Json::Value made;
    EXPECT_EQ(ZovaLinkCreate("alice", &fields, &made), ZOVA_LINK_TOO_MANY);
    EXPECT_EQ(ZovaLinkDelete("alice", hash.c_str()), ZOVA_LINK_OK);
    EXPECT_EQ(ZovaLinkCreate("alice", &fields, &made), ZOVA_LINK_OK);
}

// ---- visitors ----

TEST_F(SharingLinks, ThatArePublicOpenWithoutASession) {
    EXPECT_EQ(Open(Create()), ZOVA_LINK_OK);
    EXPECT_EQ(lastSid, "");
}

TEST_F(SharingLinks, OpenWithTheirPasswordAlone) {
    const std::string hash = Create(R"({"protect_type": 1, "password": "secret"})");
    for (const char* wrong : {"", "Secret", "secret "}) {
        EXPECT_EQ(Open(hash, wrong, nullptr, "192.0.2.99"), ZOVA_LINK_REFUSED) << wrong;
        EXPECT_EQ(lastSid, "untouched");
    }
    EXPECT_EQ(Open(hash, nullptr), ZOVA_LINK_REFUSED);
    EXPECT_EQ(Open(hash, "secret"), ZOVA_LINK_OK);
    EXPECT_EQ(lastSid.size(), 64u);
    EXPECT_NEAR(static_cast<double>(lastEnd - time(nullptr)), 12 * 3600, 60);
    EXPECT_EQ(ReadWholeFile(DatabaseFile()).find(lastSid), std::string::npos);
}

TEST_F(SharingLinks, AreClosedToThoseWhoGuessTooOftenButNotTheirOwnersAccount) {
    const std::string hash = Create(R"({"protect_type": 1, "password": "secret"})");
    const std::string other = Create(R"({"protect_type": 1, "password": "secret"})");
    for (int attempt = 0; attempt < 5; ++attempt) {
        EXPECT_EQ(Open(hash, "wrong", nullptr, "192.0.2.50"), ZOVA_LINK_REFUSED);
    }
    EXPECT_EQ(Open(hash, "secret", nullptr, "192.0.2.50"), ZOVA_LINK_BLOCKED);
    EXPECT_EQ(Open(hash, "secret", nullptr, "192.0.2.51"), ZOVA_LINK_BLOCKED) << "from another address";
    EXPECT_EQ(Open(other, "secret", nullptr, "192.0.2.50"), ZOVA_LINK_BLOCKED) << "another link from the address";
    EXPECT_EQ(Open(other, "secret", nullptr, "192.0.2.51"), ZOVA_LINK_OK);
    EXPECT_EQ(ZovaLoginCheckPassword("alice", kPassword, "192.0.2.51"), ZOVA_LOGIN_OK);
}

TEST_F(SharingLinks, ForNamedUsersOpenWithTheUsersOwnPassword) {
    const std::string hash = Create(R"({"protect_type": 2, "users": ["boss"]})");
    EXPECT_EQ(Open(hash, "wrong", "boss"), ZOVA_LINK_REFUSED);
    EXPECT_EQ(Open(hash, kPassword, "alice"), ZOVA_LINK_REFUSED) << "not on the list";
    EXPECT_EQ(Open(hash, nullptr, nullptr), ZOVA_LINK_REFUSED);
    EXPECT_EQ(Open(hash, kPassword, "boss"), ZOVA_LINK_OK);
    ZOVA::sharing::record::Session session;
    ASSERT_TRUE(
        ZOVA::sharing::db::SessionDB(ZOVA::sharing::db::SharingDB::Instance()).GetBySessionId(lastSid, session));
    EXPECT_EQ(session.get_uid(), 61002u);
}

TEST_F(SharingLinks, ThatAreClosedCannotBeToldFromUnknownOnes) {
    EXPECT_EQ(Open(std::string(32, 'a')), ZOVA_LINK_UNKNOWN);
    const std::string limited = Create(R"({"visit_limit": 2})");
    EXPECT_EQ(Open(std::string(32, 'a')), ZOVA_LINK_UNKNOWN);
    EXPECT_EQ(Open("nonsense"), ZOVA_LINK_UNKNOWN);
    EXPECT_EQ(Open(limited), ZOVA_LINK_OK);
    EXPECT_EQ(Open(limited), ZOVA_LINK_OK);
    EXPECT_EQ(Open(limited), ZOVA_LINK_UNKNOWN);
    EXPECT_EQ(Open(Create(R"({"enabled": false})")), ZOVA_LINK_UNKNOWN);
    const std::string near = Create(R"({"addresses": ["192.0.2.7"], "visit_limit": 5})");
    EXPECT_EQ(Open(near, nullptr, nullptr, "192.0.2.8"), ZOVA_LINK_UNKNOWN);
    EXPECT_EQ(Open(near, nullptr, nullptr, nullptr), ZOVA_LINK_UNKNOWN);
    EXPECT_EQ(Open(near), ZOVA_LINK_OK);
}

TEST_F(SharingLinks, EndTheirSessionsNoLaterThanThemselves) {
    const long long end = time(nullptr) + 100;
    const std::string hash = Create(R"({"visit_limit": 5, "expires": )" + std::to_string(end) + "}");
    ASSERT_EQ(Open(hash), ZOVA_LINK_OK);
    EXPECT_EQ(lastEnd, end);
}

TEST_F(SharingLinks, SweepSessionsThatHaveEnded) {
    const std::string hash = Create(R"({"visit_limit": 5})");
    ASSERT_EQ(Open(hash), ZOVA_LINK_OK);
    const std::string old = lastSid;
    Run("UPDATE sessions SET expires = 1");
    EXPECT_EQ(Judge(hash, old), -1);
    ASSERT_EQ(Open(hash), ZOVA_LINK_OK);
    EXPECT_EQ(Judge(hash, old), -5);
}

TEST_F(SharingLinks, TakeNoBufferThatIsTooSmall) {
    const std::string hash = Create(R"({"visit_limit": 5})");
    const ZovaLinkVisit visit{};
    char small[64];
    long long end = 0;
    EXPECT_EQ(ZovaLinkOpen(hash.c_str(), &visit, small, sizeof(small), &end), ZOVA_LINK_FAILED);
    EXPECT_EQ(ZovaLinkOpen(hash.c_str(), nullptr, small, sizeof(small), &end), ZOVA_LINK_UNKNOWN);
    EXPECT_EQ(ZovaLinkOpen(nullptr, &visit, small, sizeof(small), &end), ZOVA_LINK_UNKNOWN);
}

// ---- what a link shares ----

TEST_F(SharingLinks, ShareTheirPathsAndWhatLiesBelowAndNothingElse) {
    const std::string other = InRoot("/scratch/others");
    WriteFile(other + "/file", "x");
    WriteFile(InRoot("/scratch/album2/file"), "x");
    WriteFile(Shared() + "/deep/file", "x");
    for (const std::string& path : {std::string("/scratch/album2"), std::string("/scratch/album2/file"),
                                    std::string("/scratch/album/deep"), std::string("/scratch/album/deep/file")}) {
        GiveTo(InRoot(path), kAliceUid);
    }
    ASSERT_EQ(symlink((Shared() + "/photo.jpg").c_str(), (Shared() + "/soft").c_str()), 0);
    ASSERT_EQ(symlink(other.c_str(), (Shared() + "/way").c_str()), 0);
    ASSERT_EQ(link((other + "/file").c_str(), (Shared() + "/hard").c_str()), 0);
    const std::string hash = Create();
    ZOVA::sharing::record::Entry entry;
    ASSERT_TRUE(ZOVA::sharing::db::EntryDB(ZOVA::sharing::db::SharingDB::Instance()).GetByHash(hash, entry));
    const auto shares = [&](const std::string& path) {
        return reference::UniqueFd(ZovaLinkOpenPath(&entry, path.c_str())).IsOpen();
    };
    for (const char* good : {"", "/photo.jpg", "/deep", "/deep/file"}) {
        EXPECT_TRUE(shares(Shared() + good)) << good;
    }
    for (const char* bad : {"/", "/none", "/../album/photo.jpg", "/deep/../photo.jpg", "/./photo.jpg", "//photo.jpg",
                            "/soft", "/way", "/way/file", "/hard", "2", "2/file", "/deep/.."}) {
        EXPECT_FALSE(shares(Shared() + bad)) << bad;
    }
    for (const char* bad : {"", "/", "photo.jpg", "/etc/passwd"}) {
        EXPECT_FALSE(shares(bad)) << bad;
    }
    EXPECT_LT(ZovaLinkOpenPath(&entry, nullptr), 0);
    EXPECT_LT(ZovaLinkOpenPath(nullptr, Shared().c_str()), 0);
    const ZOVA::sharing::record::Entry none;
    EXPECT_LT(ZovaLinkOpenPath(&none, Shared().c_str()), 0);
}
