#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstring>
#include <ctime>
#include <functional>
#include <set>
#include <vector>

#include "PrivateDevice.h"
#include "Seam.h"
#include "common/Crypto.h"
#include "common/Hex.h"
#include "common/JsonText.h"
#include "zovaaccesstoken/TokenRecord.h"
#include "zovaaccesstoken/TokenStore.h"

namespace {

constexpr long long kHour = 3600;

std::string Folder() {
    return InRoot("/var/lib/zova/access-tokens");
}

std::string FileOf(const std::string& token) {
    std::string digest;
    EXPECT_TRUE(reference::crypto::Sha256(token, digest));
    return Folder() + "/" + reference::HexText(digest);
}

Json::Value Parsed(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(reference::ParseJson(text, value)) << text;
    return value;
}

/** A device with users who keep access tokens. */
class AccessTokens : public DeviceTest {
protected:
    static constexpr const char* kApis = R"([{"api":"ZOVA.Core.User","methods":["get","list"]},)"
                                         R"({"api":"ZOVA.Core.System","methods":"*"}])";

    static int Create(const char* user, long long seconds, const std::string& apis, const char* label = "") {
        Json::Value made;
        const Json::Value wanted = Parsed(apis);
        return ZovaAccessTokenCreate(user, label, seconds, &wanted, &made);
    }

    static Json::Value Make(const char* user = "alice", const char* label = "") {
        Json::Value made;
        const Json::Value apis = Parsed(kApis);
        EXPECT_EQ(ZovaAccessTokenCreate(user, label, kHour, &apis, &made), ZOVA_ACCESS_TOKEN_OK);
        return made;
    }

    static std::string MakeToken(const char* user = "alice") { return Make(user)["token"].asString(); }

    static Json::Value List(const char* user) {
        Json::Value tokens;
        EXPECT_EQ(ZovaAccessTokenList(user, &tokens), ZOVA_ACCESS_TOKEN_OK);
        return tokens;
    }

    /** The user whom the token is granted for; "" after a refusal, which has to leave the buffer alone. */
    static std::string Granted(const std::string& token, const char* api = "ZOVA.Core.User",
                               const char* method = "get") {
        char user[493] = "before";
        if (ZovaAccessTokenGrant(&token, api, method, user, sizeof(user)) >= 0) {
            return user;
        }
        EXPECT_STREQ(user, "before");
        return "";
    }

    /** Changes the record of a token behind the library's back. */
    static void Change(const std::string& token, const std::function<void(Json::Value&)>& change) {
        Json::Value record = Parsed(ReadWholeFile(FileOf(token)));
        change(record);
        WriteFile(FileOf(token), reference::WriteJson(record));
    }

    static void Expire(const std::string& token, int64_t created, int64_t expires) {
        Change(token, [&](Json::Value& record) {
            record["created"] = Json::Int64(created);
            record["expires"] = Json::Int64(expires);
        });
    }
};

}  // namespace

TEST_F(AccessTokens, GrantWhatTheyListToTheirUser) {
    const Json::Value made = Make();
    const std::string token = made["token"].asString();
    EXPECT_EQ(Granted(token, "ZOVA.Core.User", "get"), "alice");
    EXPECT_EQ(Granted(token, "ZOVA.Core.User", "list"), "alice");
    EXPECT_EQ(Granted(token, "ZOVA.Core.System", "anything"), "alice");
    EXPECT_EQ(Granted(MakeToken("boss")), "boss");
    EXPECT_EQ(made.getMemberNames(), (std::vector<std::string>{"expires", "id", "token"}));
    EXPECT_TRUE(reference::IsTokenId(made["id"].asString()));
    EXPECT_EQ(token.size(), 64u);
    EXPECT_EQ(token.find_first_not_of("0123456789abcdef"), std::string::npos);
}

TEST_F(AccessTokens, CompareApisAndMethodsAsAWhole) {
    const std::string token = MakeToken();
    const std::pair<const char*, const char*> rows[] = {{"ZOVA.Core", "get"},
                                                        {"ZOVA.Core.Use", "get"},
                                                        {"ZOVA.Core.User.More", "get"},
                                                        {"zova.core.user", "get"},
                                                        {"", "get"},
                                                        {"*", "get"},
                                                        {"ZOVA.Core.User", "ge"},
                                                        {"ZOVA.Core.User", "gets"},
                                                        {"ZOVA.Core.User", ""},
                                                        {"ZOVA.Core.User", "*"},
                                                        {"ZOVA.Core.User", "set"},
                                                        {"ZOVA.Core.User", "GET"},
                                                        {"ZOVA.Core.System.x", "info"},
                                                        {"ZOVA.Core.Task", "status"}};
    for (const auto& [api, method] : rows) {
        EXPECT_EQ(Granted(token, api, method), "") << api << " " << method;
    }
}

TEST_F(AccessTokens, AreKeptAsHashesInAFolderOfRootsOwn) {
    const Json::Value made = Make("alice", "my \"label\" \xc3\xa9");
    const std::string token = made["token"].asString();
    EXPECT_EQ(ModeOf(Folder()), 0700u);
    EXPECT_EQ(ModeOf(FileOf(token)), 0600u);
    const std::string content = ReadWholeFile(FileOf(token));
    EXPECT_EQ(content.find(token), std::string::npos);
    const Json::Value record = Parsed(content);
    EXPECT_EQ(record["user"], "alice");
    EXPECT_EQ(record["uid"].asUInt(), kAliceUid);
    EXPECT_EQ(record["label"], "my \"label\" \xc3\xa9");
    EXPECT_EQ(record["apis"], Parsed(kApis));
    EXPECT_EQ(record["expires"].asInt64() - record["created"].asInt64(), kHour);
    EXPECT_EQ(record["expires"], made["expires"]);
}

TEST_F(AccessTokens, AreNamedByTheirSha256) {
    std::string digest;
    ASSERT_TRUE(reference::crypto::Sha256("abc", digest));
    EXPECT_EQ(reference::HexText(digest), "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
}

TEST_F(AccessTokens, AreRefusedInAnyOtherForm) {
    const std::string token = MakeToken();
    std::string upper = token;
    for (char& digit : upper) {
        digit = digit >= 'a' ? static_cast<char>(digit - 'a' + 'A') : digit;
    }
    ASSERT_NE(upper, token);
    const std::string name = FileOf(token).substr(Folder().size() + 1);
    for (const std::string& other :
         {std::string(), token.substr(1), token + "0", " " + token.substr(1), upper, name, std::string(64, 'g'),
          std::string("../access-tokens/") + token, std::string(64, '0'), std::string(64, '\0'), token + '\0',
          std::string(1 << 20, 'a')}) {
        EXPECT_EQ(Granted(other), "");
    }
    EXPECT_EQ(Granted(token), "alice");
}

TEST_F(AccessTokens, TouchNoFileForATokenThatIsNone) {
    EXPECT_EQ(Granted("short"), "");
    EXPECT_EQ(Granted(std::string(64, '0')), "");
    EXPECT_FALSE(Exists(Folder()));
}

TEST_F(AccessTokens, AreRefusedWithoutUsableArguments) {
    const std::string token = MakeToken();
    char user[493] = "before";
    EXPECT_LT(ZovaAccessTokenGrant(nullptr, "ZOVA.Core.User", "get", user, sizeof(user)), 0);
    EXPECT_LT(ZovaAccessTokenGrant(&token, nullptr, "get", user, sizeof(user)), 0);
    EXPECT_LT(ZovaAccessTokenGrant(&token, "ZOVA.Core.User", nullptr, user, sizeof(user)), 0);
    EXPECT_LT(ZovaAccessTokenGrant(&token, "ZOVA.Core.User", "get", nullptr, sizeof(user)), 0);
    EXPECT_LT(ZovaAccessTokenGrant(nullptr, nullptr, nullptr, nullptr, 0), 0);
    for (const int size : {-1, 0, 1, 5}) {
        EXPECT_LT(ZovaAccessTokenGrant(&token, "ZOVA.Core.User", "get", user, size), 0) << size;
    }
    EXPECT_STREQ(user, "before");
    EXPECT_EQ(ZovaAccessTokenGrant(&token, "ZOVA.Core.User", "get", user, 6), 0);
    EXPECT_STREQ(user, "alice");
}

TEST_F(AccessTokens, AreGoodUntilTheyExpire) {
    const std::string token = MakeToken();
    const int64_t now = time(nullptr);
    Expire(token, now - 100, now + 30);
    EXPECT_EQ(Granted(token), "alice");
    Expire(token, now - 100, now - 1);
    EXPECT_EQ(Granted(token), "");
    Expire(token, 0, 1);
    EXPECT_EQ(Granted(token), "");
}

TEST(TokenRecord, IsInForceBeforeTheSecondInWhichItExpires) {
    reference::TokenRecord record;
    record.created = 1000;
    record.expires = 2000;
    EXPECT_TRUE(record.IsInForce(1000));
    EXPECT_TRUE(record.IsInForce(1999));
    EXPECT_FALSE(record.IsInForce(2000));
    EXPECT_FALSE(record.IsInForce(2001));
    // A clock that was put right by a little, and one that lost the date.
    EXPECT_TRUE(record.IsInForce(700));
    EXPECT_FALSE(record.IsInForce(699));
    EXPECT_FALSE(record.IsInForce(0));
}

TEST_F(AccessTokens, EndWithTheirAccount) {
    const std::string token = MakeToken();
    Change(token, [](Json::Value& record) { record["uid"] = 61999; });
    EXPECT_EQ(Granted(token), "");
    const std::pair<const char*, unsigned int> others[] = {{"nobodyknows", 61001}, {"locked", 61004},
                                                           {"expired", 61005},     {"root", 0},
                                                           {"otherroot", 0},       {"system", 61006}};
    for (const auto& [user, uid] : others) {
        Change(token, [&, name = user, id = uid](Json::Value& record) {
            record["user"] = name;
            record["uid"] = id;
        });
        EXPECT_EQ(Granted(token), "") << user;
    }
    Change(token, [](Json::Value& record) {
        record["user"] = "boss";
        record["uid"] = 61002;
    });
    EXPECT_EQ(Granted(token), "boss");
}

TEST_F(AccessTokens, AreRefusedWithARecordThatCannotBeTrusted) {
    const std::string token = MakeToken();
    const std::string file = FileOf(token);
    const std::string content = ReadWholeFile(file);
    for (const mode_t mode : {0640u, 0604u, 0620u, 0602u}) {
        ASSERT_EQ(chmod(file.c_str(), mode), 0);
        EXPECT_EQ(Granted(token), "") << mode;
    }
    ASSERT_EQ(chmod(file.c_str(), 0600), 0);
    ASSERT_EQ(chown(file.c_str(), kAliceUid, 0), 0);
    EXPECT_EQ(Granted(token), "");
    ASSERT_EQ(unlink(file.c_str()), 0);
    WriteFile(InRoot("/scratch/record"), content);
    ASSERT_EQ(symlink(InRoot("/scratch/record").c_str(), file.c_str()), 0);
    EXPECT_EQ(Granted(token), "");
    ASSERT_EQ(unlink(file.c_str()), 0);
    ASSERT_EQ(mkdir(file.c_str(), 0700), 0);
    EXPECT_EQ(Granted(token), "");
    ASSERT_EQ(rmdir(file.c_str()), 0);
    ASSERT_EQ(mkfifo(file.c_str(), 0600), 0);
    EXPECT_EQ(Granted(token), "");
    ASSERT_EQ(unlink(file.c_str()), 0);
    WriteFile(file, content);
    EXPECT_EQ(Granted(token), "alice");
}

TEST_F(AccessTokens, AreRefusedWithEachPartOfARecord) {
    const std::string token = MakeToken();
    const std::string content = ReadWholeFile(FileOf(token));
    for (size_t length = 0; length < content.size(); ++length) {
        WriteFile(FileOf(token), content.substr(0, length));
        ASSERT_EQ(Granted(token), "") << length;
    }
    for (const std::string& other : {content + "x", content + content, std::string("null"), std::string(20000, ' ')}) {
        WriteFile(FileOf(token), other);
        EXPECT_EQ(Granted(token), "");
    }
    WriteFile(FileOf(token), content);
    EXPECT_EQ(Granted(token), "alice");
}

TEST(TokenRecord, NeedsEachMemberInItsForm) {
    const std::string good = R"({"id":"00112233445566778899aabbccddeeff","user":"alice","uid":61001,"label":"",)"
                             R"("created":1000,"expires":2000,"apis":[{"api":"A.B","methods":["get"]}]})";
    reference::TokenRecord record;
    ASSERT_TRUE(reference::ParseTokenRecord(good, record));
    EXPECT_EQ(reference::WriteTokenRecord(record), reference::WriteJson(Parsed(good)));
    const std::string longText(493, 'a');
    const std::pair<const char*, std::vector<std::string>> rows[] = {
        {"id", {"null", "\"\"", "7", "\"00112233445566778899AABBCCDDEEFF\"", "\"00112233445566778899aabbccddeef\""}},
        {"user", {"null", "\"\"", "7", "\"a\\u0000b\"", "\"a\\nb\"", "\"" + longText + "\"", "[\"alice\"]"}},
        {"uid", {"null", "-1", "1.5", "\"0\"", "4294967295", "18446744073709551615"}},
        {"label", {"null", "7", "\"\\u0007\"", "\"" + std::string(129, 'a') + "\""}},
        {"created", {"null", "-1", "\"0\"", "2001", "18446744073709551615", "1e300"}},
        {"expires", {"null", "999", "315361001", "9223372036854775807", "\"2000\"", "true"}},
        {"apis", {"null", "[]", "{}", "\"*\"", "[7]", "[{}]"}}};
    for (const auto& [member, values] : rows) {
        for (const std::string& value : values) {
            Json::Value changed = Parsed(good);
            changed[member] = Parsed(value);
            EXPECT_FALSE(reference::ParseTokenRecord(reference::WriteJson(changed), record)) << member << value;
        }
        Json::Value without = Parsed(good);
        without.removeMember(member);
        EXPECT_FALSE(reference::ParseTokenRecord(reference::WriteJson(without), record)) << member;
    }
    EXPECT_EQ(record.user, "alice");
    Json::Value highest = Parsed(good);
    highest["expires"] = 315361000;
    highest["uid"] = Json::UInt(4294967294);
    EXPECT_TRUE(reference::ParseTokenRecord(reference::WriteJson(highest), record));
}

TEST_F(AccessTokens, AreMadeForListsOfApisOnly) {
    const std::string longApi(129, 'a');
    const std::string longMethod(65, 'a');
    for (const std::string& apis : {std::string("null"),
                                    std::string("{}"),
                                    std::string("[]"),
                                    std::string("\"*\""),
                                    std::string("[\"A.B\"]"),
                                    std::string(R"([{"api":"A.B"}])"),
                                    std::string(R"([{"methods":"*"}])"),
                                    std::string(R"([{"api":"*","methods":"*"}])"),
                                    std::string(R"([{"api":"","methods":"*"}])"),
                                    std::string(R"([{"api":"A B","methods":"*"}])"),
                                    std::string(R"([{"api":"A.B\u0000","methods":"*"}])"),
                                    std::string(R"([{"api":"../A","methods":"*"}])"),
                                    std::string(R"([{"api":7,"methods":"*"}])"),
                                    std::string(R"([{"api":"A.B","methods":[]}])"),
                                    std::string(R"([{"api":"A.B","methods":"get"}])"),
                                    std::string(R"([{"api":"A.B","methods":["*"]}])"),
                                    std::string(R"([{"api":"A.B","methods":[""]}])"),
                                    std::string(R"([{"api":"A.B","methods":[7]}])"),
                                    std::string(R"([{"api":"A.B","methods":null}])"),
                                    std::string(R"([{"api":"A.B","methods":{"get":1}}])"),
                                    std::string(R"([{"api":"A.B","methods":"*","more":1}])"),
                                    std::string(R"([{"api":"A.B","methods":"*"},{"api":"A.C"}])"),
                                    R"([{"api":")" + longApi + R"(","methods":"*"}])",
                                    R"([{"api":"A.B","methods":[")" + longMethod + R"("]}])"}) {
        EXPECT_EQ(Create("alice", kHour, apis), ZOVA_ACCESS_TOKEN_BAD_APIS) << apis;
    }
    Json::Value made;
    EXPECT_EQ(ZovaAccessTokenCreate("alice", "", kHour, nullptr, &made), ZOVA_ACCESS_TOKEN_BAD_APIS);
    EXPECT_TRUE(made.isNull());
    EXPECT_FALSE(Exists(Folder()));
}

TEST_F(AccessTokens, OpenNoSessionsAndNoBatchesAndMakeNoTokens) {
    for (const char* api : {"ZOVA.Core.Session", "ZOVA.Core.Token", "ZOVA.Entry.Request"}) {
        const std::string scope = std::string(R"({"api":")") + api + R"(","methods":"*"})";
        EXPECT_EQ(Create("alice", kHour, "[" + scope + "]"), ZOVA_ACCESS_TOKEN_BAD_APIS) << api;
        EXPECT_EQ(Create("alice", kHour, R"([{"api":"A.B","methods":"*"},)" + scope + "]"), ZOVA_ACCESS_TOKEN_BAD_APIS);
        // Nor where a record says so all the same.
        const std::string token = MakeToken();
        Change(token, [&](Json::Value& record) { record["apis"].append(Parsed(scope)); });
        EXPECT_EQ(Granted(token, api, "create"), "");
    }
}

TEST_F(AccessTokens, HoldSixtyFourApisAndAsManyAsFitARecord) {
    Json::Value apis(Json::arrayValue);
    for (int at = 0; at < 64; ++at) {
        apis.append(Parsed(R"({"api":"A.B)" + std::to_string(at) + R"(","methods":["get"]})"));
    }
    EXPECT_EQ(Create("alice", kHour, reference::WriteJson(apis)), ZOVA_ACCESS_TOKEN_OK);
    Json::Value many = apis;
    many.append(Parsed(R"({"api":"A.C","methods":["get"]})"));
    EXPECT_EQ(Create("alice", kHour, reference::WriteJson(many)), ZOVA_ACCESS_TOKEN_BAD_APIS);
    for (Json::Value& api : apis) {
        for (int at = 0; at < 60; ++at) {
            api["methods"].append("method" + std::to_string(at));
        }
    }
    EXPECT_EQ(Create("alice", kHour, reference::WriteJson(apis)), ZOVA_ACCESS_TOKEN_BAD_APIS);
}

TEST_F(AccessTokens, AreMadeForTimesBetweenAMinuteAndTenYears) {
    const long long longest = 10LL * 365 * 86400;
    for (const long long seconds : {0LL, 59LL, -1LL, longest + 1, -9223372036854775807LL - 1, 9223372036854775807LL}) {
        EXPECT_EQ(Create("alice", seconds, kApis), ZOVA_ACCESS_TOKEN_BAD_TIME) << seconds;
    }
    EXPECT_EQ(Create("alice", 60, kApis), ZOVA_ACCESS_TOKEN_OK);
    EXPECT_EQ(Create("alice", longest, kApis), ZOVA_ACCESS_TOKEN_OK);
    EXPECT_EQ(List("alice").size(), 2u);
}

TEST_F(AccessTokens, AreMadeForAccountsInForceAndWithShortLabels) {
    for (const char* user :
         {static_cast<const char*>(nullptr), "", "nobodyknows", "root", "otherroot", "system", "locked", "expired"}) {
        EXPECT_EQ(Create(user, kHour, kApis), ZOVA_ACCESS_TOKEN_NO_USER);
    }
    for (const std::string& label : {std::string("a\nb"), std::string("\x7f"), std::string(129, 'a')}) {
        EXPECT_EQ(Create("alice", kHour, kApis, label.c_str()), ZOVA_ACCESS_TOKEN_BAD_LABEL);
    }
    EXPECT_EQ(Create("alice", kHour, kApis, nullptr), ZOVA_ACCESS_TOKEN_BAD_LABEL);
    EXPECT_EQ(Create("alice", kHour, kApis, std::string(128, 'a').c_str()), ZOVA_ACCESS_TOKEN_OK);
}

TEST_F(AccessTokens, AreListedForTheirUserWithoutWhatGrants) {
    const Json::Value first = Make("alice", "first");
    MakeToken("boss");
    const Json::Value second = Make("alice", "second");
    Change(first["token"].asString(), [](Json::Value& record) { record["created"] = record["created"].asInt64() - 5; });
    const Json::Value tokens = List("alice");
    ASSERT_EQ(tokens.size(), 2u);
    EXPECT_EQ(tokens[0]["id"], first["id"]);
    EXPECT_EQ(tokens[0]["label"], "first");
    EXPECT_EQ(tokens[0]["apis"], Parsed(kApis));
    EXPECT_EQ(tokens[0]["expires"], first["expires"]);
    EXPECT_EQ(tokens[1]["id"], second["id"]);
    EXPECT_EQ(tokens[1].getMemberNames(), (std::vector<std::string>{"apis", "created", "expires", "id", "label"}));
    const std::string text = reference::WriteJson(tokens);
    for (const Json::Value& made : {first, second}) {
        EXPECT_EQ(text.find(made["token"].asString()), std::string::npos);
        EXPECT_EQ(text.find(FileOf(made["token"].asString()).substr(Folder().size() + 1)), std::string::npos);
    }
    EXPECT_EQ(List("primaryboss"), Json::Value(Json::arrayValue));
    Json::Value none;
    EXPECT_EQ(ZovaAccessTokenList("nobodyknows", &none), ZOVA_ACCESS_TOKEN_NO_USER);
    EXPECT_EQ(ZovaAccessTokenList(nullptr, &none), ZOVA_ACCESS_TOKEN_NO_USER);
    EXPECT_TRUE(none.isNull());
}

TEST_F(AccessTokens, AreRevokedByTheirUserOnly) {
    const Json::Value made = Make();
    const std::string token = made["token"].asString();
    const std::string other = MakeToken();
    const char* id = made["id"].asCString();
    EXPECT_EQ(ZovaAccessTokenRevoke("boss", id), ZOVA_ACCESS_TOKEN_UNKNOWN);
    EXPECT_EQ(ZovaAccessTokenRevoke("nobodyknows", id), ZOVA_ACCESS_TOKEN_NO_USER);
    EXPECT_EQ(Granted(token), "alice");
    EXPECT_EQ(ZovaAccessTokenRevoke("alice", id), ZOVA_ACCESS_TOKEN_OK);
    EXPECT_EQ(Granted(token), "");
    EXPECT_EQ(Granted(other), "alice");
    EXPECT_EQ(List("alice").size(), 1u);
    EXPECT_EQ(ZovaAccessTokenRevoke("alice", id), ZOVA_ACCESS_TOKEN_UNKNOWN);
    for (const char* bad : {static_cast<const char*>(nullptr), "", "*", "../x", "00112233445566778899aabbccddeeff"}) {
        EXPECT_EQ(ZovaAccessTokenRevoke("alice", bad), ZOVA_ACCESS_TOKEN_UNKNOWN);
    }
}

TEST_F(AccessTokens, OfAFormerAccountOfTheNameAreNotTheNewOnes) {
    const Json::Value made = Make();
    Change(made["token"].asString(), [](Json::Value& record) { record["uid"] = 61999; });
    EXPECT_EQ(List("alice").size(), 0u);
    EXPECT_EQ(ZovaAccessTokenRevoke("alice", made["id"].asCString()), ZOVA_ACCESS_TOKEN_UNKNOWN);
}

TEST_F(AccessTokens, AreSweptWhenTheyHaveExpired) {
    const std::string old = MakeToken();
    const std::string broken = MakeToken();
    const int64_t now = time(nullptr);
    Expire(old, now - 100, now - 1);
    WriteFile(FileOf(broken), "broken");
    WriteFile(Folder() + "/.new-0011", "half");
    WriteFile(Folder() + "/.new-0022", "half");
    MakeOlder(Folder() + "/.new-0011", 7200);
    EXPECT_EQ(List("alice").size(), 0u);
    EXPECT_FALSE(Exists(FileOf(old)));
    EXPECT_FALSE(Exists(Folder() + "/.new-0011"));
    EXPECT_TRUE(Exists(Folder() + "/.new-0022"));
    EXPECT_TRUE(Exists(FileOf(broken)));
}

TEST_F(AccessTokens, AreAHundredPerUserAtMostOfThoseThatHaveNotExpired) {
    std::string first;
    for (int at = 0; at < 100; ++at) {
        first = MakeToken();
    }
    EXPECT_EQ(Create("alice", kHour, kApis), ZOVA_ACCESS_TOKEN_TOO_MANY);
    EXPECT_EQ(Create("boss", kHour, kApis), ZOVA_ACCESS_TOKEN_OK);
    EXPECT_EQ(List("alice").size(), 100u);
    const int64_t now = time(nullptr);
    Expire(first, now - 100, now - 1);
    EXPECT_EQ(Create("alice", kHour, kApis), ZOVA_ACCESS_TOKEN_OK);
    EXPECT_EQ(Create("alice", kHour, kApis), ZOVA_ACCESS_TOKEN_TOO_MANY);
}

TEST_F(AccessTokens, AreFiveThousandOnTheDeviceAtMost) {
    MakeToken();
    for (int at = 0; at < 4999; ++at) {
        char name[65];
        snprintf(name, sizeof(name), "%064x", at);
        WriteFile(Folder() + "/" + name, "");
    }
    EXPECT_EQ(Create("boss", kHour, kApis), ZOVA_ACCESS_TOKEN_TOO_MANY);
    ASSERT_EQ(unlink((Folder() + "/" + std::string(64, '0')).c_str()), 0);
    EXPECT_EQ(Create("boss", kHour, kApis), ZOVA_ACCESS_TOKEN_OK);
}

TEST_F(AccessTokens, StayWithinTheirNumberWhenManyAreMadeAtOnce) {
    for (int at = 0; at < 90; ++at) {
        MakeToken();
    }
    int start[2];
    ASSERT_EQ(pipe(start), 0);
    std::vector<pid_t> makers;
    for (int at = 0; at < 20; ++at) {
        makers.push_back(fork());
        if (makers.back() == 0) {
            close(start[1]);
            char byte;
            _exit(read(start[0], &byte, 1) == 0 ? Create("alice", kHour, kApis) : -1);
        }
    }
    close(start[1]);
    close(start[0]);
    std::multiset<int> results;
    for (const pid_t maker : makers) {
        int status = -1;
        ASSERT_EQ(waitpid(maker, &status, 0), maker);
        results.insert(WEXITSTATUS(status));
    }
    EXPECT_EQ(results.count(ZOVA_ACCESS_TOKEN_OK), 10u);
    EXPECT_EQ(results.count(ZOVA_ACCESS_TOKEN_TOO_MANY), 10u);
    EXPECT_EQ(List("alice").size(), 100u);
}

TEST_F(AccessTokens, AreNotKeptInAFolderThatOthersCanEnter) {
    const std::string token = MakeToken();
    ASSERT_EQ(chmod(Folder().c_str(), 0755), 0);
    Json::Value tokens;
    EXPECT_EQ(Create("alice", kHour, kApis), ZOVA_ACCESS_TOKEN_FAILED);
    EXPECT_EQ(ZovaAccessTokenList("alice", &tokens), ZOVA_ACCESS_TOKEN_FAILED);
    EXPECT_EQ(ZovaAccessTokenRevoke("alice", "00112233445566778899aabbccddeeff"), ZOVA_ACCESS_TOKEN_FAILED);
}

TEST_F(AccessTokens, ServeRootOnly) {
    const std::string token = MakeToken();
    EXPECT_EQ(
        StatusOfChild([&] {
            if (setresgid(kAliceGid, kAliceGid, kAliceGid) != 0 || setresuid(kAliceUid, kAliceUid, kAliceUid) != 0) {
                return 1;
            }
            Json::Value tokens;
            return Granted(token).empty() && Create("alice", kHour, kApis) == ZOVA_ACCESS_TOKEN_FAILED &&
                           ZovaAccessTokenList("alice", &tokens) == ZOVA_ACCESS_TOKEN_FAILED
                       ? 0
                       : 1;
        }),
        0);
}
