#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <vector>

#include "Encipher.h"
#include "PrivateDevice.h"
#include "Seam.h"
#include "common/Base64.h"
#include "common/Hex.h"
#include "zovacgi/Envelope.h"

namespace {

constexpr const char* kLine = "account=alice&passwd=s%26cret";
constexpr const char* kPair = "__cIpHeRtExT=";

std::string PublicKey() {
    char text[1024] = "";
    EXPECT_GT(ZovaCipherPublicKey(text, sizeof(text)), 0);
    return text;
}

/** A copy that the library may write into, with a guard behind its end. */
class Writable {
public:
    explicit Writable(const std::string& text) : bytes(text.begin(), text.end()) {
        bytes.push_back('\0');
        bytes.push_back('!');
    }
    char* Text() { return bytes.data(); }
    bool IsGuardThere() const { return bytes.back() == '!'; }

private:
    std::vector<char> bytes;
};

bool Deciphers(const std::string& cipherText, std::string* plain = nullptr) {
    Writable copy(cipherText);
    const bool good = ZovaCgiDecryptParam(copy.Text()) != 0;
    EXPECT_TRUE(copy.IsGuardThere());
    if (plain != nullptr) {
        *plain = copy.Text();
    }
    return good;
}

/** The key of the envelope is made once for all tests of this process, since that takes long. */
class Cipher : public DeviceTest {
protected:
    void SetUp() override {
        DeviceTest::SetUp();
        if (savedKey.empty()) {
            PublicKey();
            savedKey = ReadWholeFile(KeyFile());
        } else {
            WriteFile(KeyFile(), savedKey);
            ASSERT_EQ(chmod(InRoot("/etc/zova").c_str(), 0700), 0);
        }
    }
    static std::string KeyFile() { return InRoot("/etc/zova/envelope-key.pem"); }
    static std::string savedKey;
};

std::string Cipher::savedKey;

std::string OutputOf(const std::string& command) {
    FILE* pipe = popen(command.c_str(), "r");
    std::string output;
    char part[4096];
    for (size_t got; pipe != nullptr && (got = fread(part, 1, sizeof(part), pipe)) > 0;) {
        output.append(part, got);
    }
    EXPECT_TRUE(pipe != nullptr && pclose(pipe) == 0) << command;
    return output;
}

}  // namespace

TEST_F(Cipher, KeepsItsKeyPrivateAndMakesItOnce) {
    EXPECT_EQ(ModeOf(KeyFile()), 0600u);
    EXPECT_EQ(ModeOf(InRoot("/etc/zova")), 0700u);
    EXPECT_EQ(PublicKey(), PublicKey());
    char small[16];
    EXPECT_LT(ZovaCipherPublicKey(small, sizeof(small)), 0);
    EXPECT_LT(ZovaCipherPublicKey(nullptr, 1024), 0);
}

TEST_F(Cipher, RefusesAKeyThatOthersCanReadAndDoesNotReplaceIt) {
    ASSERT_EQ(chmod(KeyFile().c_str(), 0644), 0);
    char text[1024];
    EXPECT_LT(ZovaCipherPublicKey(text, sizeof(text)), 0);
    EXPECT_EQ(ReadWholeFile(KeyFile()), savedKey);
    WriteFile(KeyFile(), "no key");
    EXPECT_LT(ZovaCipherPublicKey(text, sizeof(text)), 0);
    EXPECT_EQ(ReadWholeFile(KeyFile()), "no key");
}

TEST_F(Cipher, AClientCannotHaveTheKeyMade) {
    const std::string text = client::Base64Url(client::Envelope(PublicKey(), kLine));
    ASSERT_EQ(unlink(KeyFile().c_str()), 0);
    EXPECT_FALSE(Deciphers(text));
    EXPECT_FALSE(Exists(KeyFile()));
}

TEST_F(Cipher, OpensAnEnvelopeInPlace) {
    std::string plain;
    EXPECT_TRUE(Deciphers(client::Base64Url(client::Envelope(PublicKey(), kLine)), &plain));
    EXPECT_EQ(plain, kLine);
    EXPECT_TRUE(Deciphers(client::Base64Url(client::Envelope(PublicKey(), "")), &plain));
    EXPECT_EQ(plain, "");
    const std::string large(1 << 20, 'x');
    EXPECT_TRUE(Deciphers(client::Base64Url(client::Envelope(PublicKey(), large)), &plain));
    EXPECT_EQ(plain, large);
}

TEST_F(Cipher, OpensWhatTheDocumentedSampleMakes) {
    const std::string page = ReadWholeFile(ZOVA_FORMATS_PAGE);
    const std::string start = "```js\n";
    const size_t first = page.find(start);
    ASSERT_NE(first, std::string::npos);
    const std::string sample = page.substr(first + start.size(), page.find("```", first + 3) - first - start.size());
    WriteFile(InRoot("/scratch/sample.mjs"),
              sample + "\nprocess.stdout.write(await encipher(process.argv[2], process.argv[3]));\n");
    const std::string command = "node " + InRoot("/scratch/sample.mjs") + " '" + PublicKey() + "' '" + kLine + "'";
    std::string plain;
    EXPECT_TRUE(Deciphers(OutputOf(command), &plain));
    EXPECT_EQ(plain, kLine);
}

TEST_F(Cipher, RefusesAChangeOfAnyByte) {
    const std::string envelope = client::Envelope(PublicKey(), kLine);
    for (size_t at = 0; at < envelope.size(); ++at) {
        std::string changed = envelope;
        changed[at] = static_cast<char>(changed[at] ^ 0x01);
        const std::string text = client::Base64Url(changed);
        std::string left;
        ASSERT_FALSE(Deciphers(text, &left)) << at;
        ASSERT_EQ(left, text) << at;
    }
}

TEST_F(Cipher, RefusesEveryCutAndWhatIsAppended) {
    const std::string envelope = client::Envelope(PublicKey(), kLine);
    for (size_t length = 0; length < envelope.size(); ++length) {
        ASSERT_FALSE(Deciphers(client::Base64Url(envelope.substr(0, length)))) << length;
    }
    EXPECT_FALSE(Deciphers(client::Base64Url(envelope + "x")));
}

TEST_F(Cipher, RefusesOtherKeysOtherSchemesAndTextsThatAreNoEnvelope) {
    const std::string publicKey = PublicKey();
    EXPECT_FALSE(Deciphers(client::Base64Url(client::Envelope(client::ForeignPublicKey(), kLine))));

    const std::string key = client::RandomText(32);
    const std::string wrapped = client::Wrap(publicKey, key);
    const std::string header = std::string("\x01") + static_cast<char>(wrapped.size() >> 8) +
                               static_cast<char>(wrapped.size() & 0xff) + wrapped;
    EXPECT_TRUE(Deciphers(client::Base64Url(header + client::Seal(key, "zova-envelope-1", kLine))));
    EXPECT_FALSE(Deciphers(client::Base64Url(header + client::Seal(key, "zova-envelope-2", kLine))));
    EXPECT_FALSE(Deciphers(client::Base64Url(header + client::Seal(client::RandomText(32), "zova-envelope-1", kLine))));

    const std::string shortKey = client::Wrap(publicKey, key.substr(16));
    EXPECT_FALSE(
        Deciphers(client::Base64Url(header.substr(0, 3) + shortKey + client::Seal(key, "zova-envelope-1", kLine))));
    for (const std::string& text :
         {std::string(), std::string("A"), std::string("%%%"), std::string(1 << 16, 'A'), std::string("AQAA"),
          std::string("Af__"), std::string("AQ=="), std::string("\xff\xff")}) {
        EXPECT_FALSE(Deciphers(text));
    }
    EXPECT_EQ(ZovaCgiDecryptParam(nullptr), 0);
}

TEST_F(Cipher, RefusesAClearTextWithANul) {
    EXPECT_FALSE(Deciphers(client::Base64Url(client::Envelope(PublicKey(), std::string("a=1\0&b=2", 8)))));
}

TEST_F(Cipher, RecognisesALineThatIsOneEncipheredPair) {
    Writable line(kPair + client::Base64Url(client::Envelope(PublicKey(), kLine)));
    EXPECT_EQ(ZovaCgiDetectAndDecryptParamLine(line.Text()), line.Text());
    EXPECT_STREQ(line.Text(), kLine);
    EXPECT_TRUE(line.IsGuardThere());
}

TEST_F(Cipher, LeavesEveryOtherLineAlone) {
    const std::string cipherText = client::Base64Url(client::Envelope(PublicKey(), kLine));
    for (const std::string& text : {std::string(), std::string("a=1&b=2"), "a=1&" + (kPair + cipherText),
                                    kPair + cipherText + "&a=1", kPair + cipherText + "%20", "x" + (kPair + cipherText),
                                    "__cipherText=" + cipherText, "__cIpHeRtExT" + cipherText}) {
        Writable line(text);
        EXPECT_EQ(ZovaCgiDetectAndDecryptParamLine(line.Text()), line.Text());
        EXPECT_EQ(std::string(line.Text()), text);
    }
    EXPECT_EQ(ZovaCgiDetectAndDecryptParamLine(nullptr), nullptr);
}

TEST_F(Cipher, FailsAnEncipheredLineThatCannotBeOpened) {
    for (const std::string& text : {std::string(kPair), kPair + std::string("AAAA"),
                                    kPair + client::Base64Url(client::Envelope(client::ForeignPublicKey(), kLine))}) {
        Writable line(text);
        EXPECT_EQ(ZovaCgiDetectAndDecryptParamLine(line.Text()), nullptr);
    }
}

TEST(EnvelopeBytes, AreSplitWithinTheirBounds) {
    reference::Envelope envelope;
    const std::string body(12 + 16, 'b');
    const std::string bytes = std::string("\x01\0\x02kk", 5) + body;
    EXPECT_TRUE(reference::SplitEnvelope(bytes, envelope));
    EXPECT_EQ(envelope.wrappedKey, "kk");
    EXPECT_EQ(envelope.nonce.size(), 12u);
    EXPECT_EQ(envelope.sealed.size(), 16u);
    EXPECT_FALSE(reference::SplitEnvelope(std::string("\x01\0\x03kk", 5) + body, envelope));
    EXPECT_FALSE(reference::SplitEnvelope(std::string("\x01\xff\xffkk", 5) + body, envelope));
    EXPECT_FALSE(reference::SplitEnvelope(std::string("\x01\0\0", 3) + body, envelope));
    EXPECT_FALSE(reference::SplitEnvelope(std::string("\x02\0\x02kk", 5) + body, envelope));
    EXPECT_FALSE(reference::SplitEnvelope("", envelope));
}

TEST(AesText, OpensBothSpellingsOfBase64) {
    const std::string key = "0123456789abcdef0123456789abcdef";
    const std::string sealed = client::Seal(key, "", kLine);
    std::string plain;
    EXPECT_TRUE(ZOVA::CredRequestUtil::GetDecryptAESString(key, client::Base64Url(sealed), plain));
    EXPECT_EQ(plain, kLine);
    plain.clear();
    EXPECT_TRUE(ZOVA::CredRequestUtil::GetDecryptAESString(key, reference::Base64Encode(sealed), plain));
    EXPECT_EQ(plain, kLine);
}

TEST(AesText, RefusesEveryChangeEveryCutAndOtherKeysAndLeavesTheTargetAlone) {
    const std::string key = "0123456789abcdef0123456789abcdef";
    const std::string sealed = client::Seal(key, "", kLine);
    std::string plain = "before";
    for (size_t at = 0; at < sealed.size(); ++at) {
        std::string changed = sealed;
        changed[at] = static_cast<char>(changed[at] ^ 0x80);
        EXPECT_FALSE(ZOVA::CredRequestUtil::GetDecryptAESString(key, client::Base64Url(changed), plain)) << at;
        EXPECT_FALSE(ZOVA::CredRequestUtil::GetDecryptAESString(key, client::Base64Url(sealed.substr(0, at)), plain))
            << at;
    }
    const std::string text = client::Base64Url(sealed);
    for (const std::string& other : {std::string(), key.substr(1), key + "0", std::string(32, '0')}) {
        EXPECT_FALSE(ZOVA::CredRequestUtil::GetDecryptAESString(other, text, plain));
    }
    EXPECT_FALSE(ZOVA::CredRequestUtil::GetDecryptAESString(key, text + "!", plain));
    EXPECT_EQ(plain, "before");
}

TEST_F(Cipher, DerivesTheKeyTextFromTheDevicesSecret) {
    char text[33] = "";
    ASSERT_EQ(ZOVACloudServiceZntokenGenerateToken("token", text, sizeof(text)), 0);
    const std::string secret = ReadWholeFile(InRoot("/etc/zova/device-secret"));
    EXPECT_EQ(secret.size(), 32u);
    EXPECT_EQ(ModeOf(InRoot("/etc/zova/device-secret")), 0600u);
    EXPECT_EQ(text, reference::HexText(client::HmacSha256(secret, "token")).substr(0, 32));
    char again[33] = "";
    ASSERT_EQ(ZOVACloudServiceZntokenGenerateToken("token", again, sizeof(again)), 0);
    EXPECT_STREQ(text, again);
    ASSERT_EQ(ZOVACloudServiceZntokenGenerateToken("other", again, sizeof(again)), 0);
    EXPECT_STRNE(text, again);
}

TEST_F(Cipher, RefusesToDeriveWithoutTokenRoomOrAGoodSecret) {
    char text[33];
    EXPECT_LT(ZOVACloudServiceZntokenGenerateToken("", text, 33), 0);
    EXPECT_LT(ZOVACloudServiceZntokenGenerateToken(nullptr, text, 33), 0);
    EXPECT_LT(ZOVACloudServiceZntokenGenerateToken("token", text, 32), 0);
    EXPECT_LT(ZOVACloudServiceZntokenGenerateToken("token", nullptr, 33), 0);
    WriteFile(InRoot("/etc/zova/device-secret"), "short");
    EXPECT_LT(ZOVACloudServiceZntokenGenerateToken("token", text, 33), 0);
    WriteFile(InRoot("/etc/zova/device-secret"), std::string(32, 's'));
    ASSERT_EQ(chown(InRoot("/etc/zova/device-secret").c_str(), kAliceUid, 0), 0);
    EXPECT_LT(ZOVACloudServiceZntokenGenerateToken("token", text, 33), 0);
}

TEST_F(Cipher, ManyProcessesAtOnceMakeOneSecret) {
    constexpr int kProcesses = 8;
    int start[2];
    int result[2];
    ASSERT_EQ(pipe(start), 0);
    ASSERT_EQ(pipe(result), 0);
    std::vector<pid_t> children;
    for (int i = 0; i < kProcesses; ++i) {
        children.push_back(fork());
        if (children.back() == 0) {
            close(start[1]);
            char text[33] = "";
            char byte;
            const bool started = read(start[0], &byte, 1) == 0;
            const bool made = ZOVACloudServiceZntokenGenerateToken("token", text, sizeof(text)) == 0;
            _exit(started && made && write(result[1], text, 32) == 32 ? 0 : 1);
        }
    }
    close(start[1]);
    std::string first;
    for (const pid_t child : children) {
        int status = -1;
        char text[32];
        ASSERT_EQ(waitpid(child, &status, 0), child);
        ASSERT_EQ(status, 0);
        ASSERT_EQ(read(result[0], text, sizeof(text)), 32);
        first = first.empty() ? std::string(text, sizeof(text)) : first;
        EXPECT_EQ(std::string(text, sizeof(text)), first);
    }
    for (int fd : {start[0], result[0], result[1]}) {
        close(fd);
    }
}
