#include <sys/stat.h>
#include <unistd.h>

#include <functional>

#include "PrivateDevice.h"
#include "Seam.h"
#include "common/JsonText.h"
#include "zovacredential/PeerTable.h"

namespace {

using reference::FindPeer;
using reference::Peer;
using reference::RelayError;

constexpr const char* kPin = "sha256//AAECAwQFBgcICQoLDA0ODxAREhMUFRYXGBkaGxwdHh8=";
const std::string kToken(64, 'a');

std::string TablePath() {
    return InRoot("/etc/zova/peers.json");
}

/** A device whose table of peers holds one peer, number 2, with alice's token. */
class PeerTable : public DeviceTest {
protected:
    void SetUp() override {
        DeviceTest::SetUp();
        record["host"] = "nas-2.example";
        record["pin"] = kPin;
        record["users"]["alice"]["uid"] = Json::UInt(kAliceUid);
        record["users"]["alice"]["token"] = kToken;
    }

    void Write() {
        Json::Value table(Json::objectValue);
        table["peers"]["2"] = record;
        WriteFile(TablePath(), reference::WriteJson(table));
    }

    static RelayError Find(const char* user = "alice", long number = 2) {
        Peer peer;
        return FindPeer(number, user, peer);
    }

    /** What becomes of the peer when its record is changed so. */
    RelayError With(const std::function<void(Json::Value&)>& change) {
        const Json::Value before = record;
        change(record);
        Write();
        record = before;
        return Find();
    }

    RelayError WithMember(const char* name, const Json::Value& value) {
        return With([&](Json::Value& peer) { peer[name] = value; });
    }

    Json::Value record;
};

}  // namespace

TEST_F(PeerTable, GivesPlacePinAndTheUsersToken) {
    Write();
    Peer peer;
    EXPECT_EQ(FindPeer(2, "alice", peer), RelayError::kNone);
    EXPECT_EQ(peer.url, "https://nas-2.example:443/webapi/front.cgi");
    EXPECT_EQ(peer.connectTo, "");
    EXPECT_EQ(peer.pin, kPin);
    EXPECT_EQ(peer.authority, "");
    EXPECT_EQ(peer.token.text, kToken);
}

TEST_F(PeerTable, TakesPortPathAddressAndAuthority) {
    WriteFile(InRoot("/scratch/ca.pem"), "certificates");
    record["port"] = 5001;
    record["path"] = "/other/front.cgi";
    record["address"] = "192.0.2.9";
    record["ca_file"] = InRoot("/scratch/ca.pem");
    record.removeMember("pin");
    Write();
    Peer peer;
    EXPECT_EQ(FindPeer(2, "alice", peer), RelayError::kNone);
    EXPECT_EQ(peer.url, "https://nas-2.example:5001/other/front.cgi");
    EXPECT_EQ(peer.connectTo, "::192.0.2.9:");
    EXPECT_EQ(peer.pin, "");
    EXPECT_EQ(peer.authority, "certificates");
}

TEST_F(PeerTable, TakesAddressesAsHosts) {
    const std::pair<const char*, const char*> rows[] = {{"192.0.2.9", "https://192.0.2.9:443/webapi/front.cgi"},
                                                        {"2001:db8::9", "https://[2001:db8::9]:443/webapi/front.cgi"}};
    for (const auto& [host, url] : rows) {
        record["host"] = host;
        record["address"] = "2001:db8::1";
        Write();
        Peer peer;
        EXPECT_EQ(FindPeer(2, "alice", peer), RelayError::kNone);
        EXPECT_EQ(peer.url, url);
        EXPECT_EQ(peer.connectTo, "::[2001:db8::1]:");
    }
}

TEST_F(PeerTable, IsAskedByTheDecimalNumber) {
    Write();
    EXPECT_EQ(Find("alice", 2), RelayError::kNone);
    for (const long number : {0L, -2L, 20L, 9223372036854775807L}) {
        EXPECT_EQ(Find("alice", number), RelayError::kUnknownPeer) << number;
    }
}

TEST_F(PeerTable, HasNoTokenForAnybodyElse) {
    Write();
    for (const char* user : {"boss", "", "Alice", "alice ", "root", "system", "nobody-knows-me"}) {
        EXPECT_EQ(Find(user), RelayError::kNoCredential) << user;
    }
}

TEST_F(PeerTable, HasNoTokenForAnotherAccountUnderTheSameName) {
    EXPECT_EQ(With([](Json::Value& peer) { peer["users"]["alice"]["uid"] = Json::UInt(kAliceUid + 1); }),
              RelayError::kNoCredential);
}

TEST_F(PeerTable, HasNoTokenForAccountsThatMayNotLogIn) {
    const std::pair<const char*, unsigned int> rows[] = {{"locked", 61004}, {"expired", 61005}, {"otherroot", 0}};
    for (const auto& [user, uid] : rows) {
        record["users"][user]["uid"] = uid;
        record["users"][user]["token"] = kToken;
        Write();
        EXPECT_EQ(Find(user), RelayError::kNoCredential) << user;
    }
}

TEST_F(PeerTable, MustBeRootsAlone) {
    EXPECT_EQ(Find(), RelayError::kNoTable) << "missing";
    Write();
    for (const unsigned int mode : {0640u, 0604u, 0620u, 0602u, 0610u}) {
        ASSERT_EQ(chmod(TablePath().c_str(), mode), 0);
        EXPECT_EQ(Find(), RelayError::kNoTable) << std::oct << mode;
    }
    ASSERT_EQ(chmod(TablePath().c_str(), 0600), 0);
    EXPECT_EQ(Find(), RelayError::kNone);
    ASSERT_EQ(chown(TablePath().c_str(), kAliceUid, 0), 0);
    EXPECT_EQ(Find(), RelayError::kNoTable) << "somebody else's";
}

TEST_F(PeerTable, IsNoLinkAndNoPipe) {
    Write();
    const std::string other = InRoot("/scratch/peers.json");
    ASSERT_EQ(rename(TablePath().c_str(), other.c_str()), 0);
    ASSERT_EQ(symlink(other.c_str(), TablePath().c_str()), 0);
    EXPECT_EQ(Find(), RelayError::kNoTable) << "link";
    ASSERT_EQ(unlink(TablePath().c_str()), 0);
    ASSERT_EQ(mkfifo(TablePath().c_str(), 0600), 0);
    EXPECT_EQ(Find(), RelayError::kNoTable) << "pipe";
}

TEST_F(PeerTable, IsOfBoundedSize) {
    Write();
    const std::string table = ReadWholeFile(TablePath());
    WriteFile(TablePath(), table + std::string((1 << 20) - table.size(), ' '));
    EXPECT_EQ(Find(), RelayError::kNone);
    WriteFile(TablePath(), table + std::string((1 << 20) - table.size() + 1, ' '));
    EXPECT_EQ(Find(), RelayError::kNoTable);
}

TEST_F(PeerTable, IsNoTableInAnyOtherForm) {
    for (const char* text : {"", "{", "[]", "null", "7", "{}", R"({"peers":[]})", R"({"peers":null})",
                             R"({"peers":{},"more":1})", R"({"peers":{}} x)", R"({"peers":{},})"}) {
        WriteFile(TablePath(), text);
        EXPECT_EQ(Find(), RelayError::kNoTable) << text;
    }
    WriteFile(TablePath(), R"({"peers":{}})");
    EXPECT_EQ(Find(), RelayError::kUnknownPeer);
}

TEST_F(PeerTable, ARecordNeedsAHostThatIsOne) {
    EXPECT_EQ(With([](Json::Value& peer) { peer.removeMember("host"); }), RelayError::kBadRecord);
    for (const char* host :
         {"", "a b", "a/b", "a:1", "a@b", "a#", "a?", "-a", ".a", "[::1]", "a%00", "g\xc3\xbc", "::1%1", "http://a"}) {
        EXPECT_EQ(WithMember("host", host), RelayError::kBadRecord) << host;
    }
    EXPECT_EQ(WithMember("host", std::string(254, 'a')), RelayError::kBadRecord);
    EXPECT_EQ(WithMember("host", std::string("a\0b", 3)), RelayError::kBadRecord);
    EXPECT_EQ(WithMember("host", 5), RelayError::kBadRecord);
}

TEST_F(PeerTable, ARecordNeedsPortPathAndAddressThatAreSome) {
    for (const Json::Value& port : {Json::Value(0), Json::Value(65536), Json::Value(-1), Json::Value("443"),
                                    Json::Value(1.5), Json::Value(), Json::Value(true)}) {
        EXPECT_EQ(WithMember("port", port), RelayError::kBadRecord) << reference::WriteJson(port);
    }
    for (const char* path : {"", "webapi", "/a?b", "/a#b", "/a b", "/a%2f", "/a\r\nX: y"}) {
        EXPECT_EQ(WithMember("path", path), RelayError::kBadRecord) << path;
    }
    for (const char* address : {"", "nas-2", "1.2.3", "1.2.3.4:5", "[::1]", "fe80::1%eth0", "1.2.3.4/8"}) {
        EXPECT_EQ(WithMember("address", address), RelayError::kBadRecord) << address;
    }
}

TEST_F(PeerTable, ARecordNeedsAPinOrAnAuthority) {
    EXPECT_EQ(With([](Json::Value& peer) { peer.removeMember("pin"); }), RelayError::kBadRecord);
    const std::string pin = kPin;
    for (const std::string& other :
         {std::string(), std::string("sha256//"), pin.substr(8), pin + ";" + pin, "sha1//" + pin.substr(8),
          pin.substr(0, pin.size() - 1), pin.substr(0, 20) + "=", pin + "=", pin.substr(0, 10) + "!" + pin.substr(11),
          std::string("/etc/zova/key.pem")}) {
        EXPECT_EQ(WithMember("pin", other), RelayError::kBadRecord) << other;
    }
    EXPECT_EQ(WithMember("pin", Json::Value()), RelayError::kBadRecord);
    EXPECT_EQ(WithMember("pin", Json::Value(Json::arrayValue)), RelayError::kBadRecord);
}

TEST_F(PeerTable, AnAuthorityThatOthersCanWriteOrThatIsNoneIsNotUsed) {
    const std::string path = InRoot("/scratch/ca.pem");
    WriteFile(path, "certificates");
    EXPECT_EQ(WithMember("ca_file", path), RelayError::kNone);
    ASSERT_EQ(chmod(path.c_str(), 0644), 0);
    EXPECT_EQ(WithMember("ca_file", path), RelayError::kNone) << "no secret";
    ASSERT_EQ(chmod(path.c_str(), 0666), 0);
    EXPECT_EQ(WithMember("ca_file", path), RelayError::kBadRecord);
    WriteFile(path, "");
    EXPECT_EQ(WithMember("ca_file", path), RelayError::kBadRecord) << "empty";
    for (const std::string& other : {InRoot("/scratch/none"), InRoot("/scratch"), std::string("ca.pem"), std::string(),
                                     std::string("/scratch/ca.pem\0x", 17)}) {
        EXPECT_EQ(WithMember("ca_file", other), RelayError::kBadRecord) << other;
    }
}

TEST_F(PeerTable, AMisspeltMemberMakesARecordUnusable) {
    for (const char* name : {"pins", "Pin", "ca-file", "user", "verify", ""}) {
        EXPECT_EQ(WithMember(name, "x"), RelayError::kBadRecord) << name;
    }
    EXPECT_EQ(With([](Json::Value& peer) { peer = Json::Value("nas"); }), RelayError::kBadRecord);
    EXPECT_EQ(With([](Json::Value& peer) { peer = Json::Value(); }), RelayError::kBadRecord);
}

TEST_F(PeerTable, AUsersEntryNeedsUidAndToken) {
    EXPECT_EQ(With([](Json::Value& peer) { peer.removeMember("users"); }), RelayError::kBadRecord);
    EXPECT_EQ(WithMember("users", Json::Value(Json::arrayValue)), RelayError::kBadRecord);
    const auto withEntry = [&](const char* name, const Json::Value& value) {
        return With([&](Json::Value& peer) { peer["users"]["alice"][name] = value; });
    };
    for (const std::string& token : {std::string(), std::string(63, 'a'), std::string(65, 'a'), std::string(64, 'A'),
                                     std::string(64, 'g'), std::string(63, 'a') + "\n"}) {
        EXPECT_EQ(withEntry("token", token), RelayError::kBadRecord) << token;
    }
    for (const Json::Value& uid : {Json::Value("61001"), Json::Value(-1), Json::Value(), Json::Value(4294967296.0)}) {
        EXPECT_EQ(withEntry("uid", uid), RelayError::kBadRecord) << reference::WriteJson(uid);
    }
    EXPECT_EQ(withEntry("more", 1), RelayError::kBadRecord);
    EXPECT_EQ(With([](Json::Value& peer) { peer["users"]["alice"] = "x"; }), RelayError::kBadRecord);
}

TEST_F(PeerTable, ABadRecordIsNoMatterToAnotherPeer) {
    Json::Value table(Json::objectValue);
    table["peers"]["1"] = "bad";
    table["peers"]["2"] = record;
    WriteFile(TablePath(), reference::WriteJson(table));
    EXPECT_EQ(Find(), RelayError::kNone);
    EXPECT_EQ(Find("alice", 1), RelayError::kBadRecord);
}
