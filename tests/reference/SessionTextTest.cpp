#include <gtest/gtest.h>

#include "zovacgi/ClientAddress.h"
#include "zovacgi/Cookies.h"
#include "zovacgi/Language.h"
#include "zovacgi/Session.h"
#include "zovacgi/SessionId.h"

namespace {

reference::Session FullSession() {
    reference::Session session;
    session.user = "alice";
    session.uid = 61001;
    session.address = "192.0.2.1";
    session.created = 1700000000;
    session.token = std::string(64, 'a');
    session.app = "an app";
    session.webapi = "w";
    session.skipCheckIp = true;
    session.timeout = 30;
    return session;
}

/** The text of a good session with one part of it replaced. */
std::string Altered(const std::string& part, const std::string& other) {
    std::string text = reference::WriteSession(FullSession());
    const size_t at = text.find(part);
    EXPECT_NE(at, std::string::npos) << part;
    return text.replace(at, part.size(), other);
}

}  // namespace

TEST(SessionText, ReadsBackWhatItWrote) {
    reference::Session read;
    ASSERT_TRUE(reference::ParseSession(reference::WriteSession(FullSession()), read));
    EXPECT_EQ(read.user, "alice");
    EXPECT_EQ(read.uid, 61001u);
    EXPECT_EQ(read.address, "192.0.2.1");
    EXPECT_EQ(read.created, 1700000000);
    EXPECT_EQ(read.token, std::string(64, 'a'));
    EXPECT_EQ(read.app, "an app");
    EXPECT_EQ(read.webapi, "w");
    EXPECT_EQ(read.skipCheckIp, std::optional<bool>(true));
    EXPECT_EQ(read.timeout, 30);
}

TEST(SessionText, RefusesEveryCutOfAGoodText) {
    const std::string text = reference::WriteSession(FullSession());
    for (size_t length = 0; length < text.size(); ++length) {
        reference::Session session;
        EXPECT_FALSE(reference::ParseSession(text.substr(0, length), session)) << length;
    }
}

TEST(SessionText, RefusesMembersOfAnotherFormOrRange) {
    const std::pair<const char*, const char*> alterations[] = {
        {"\"user\":\"alice\"", "\"user\":\"\""},
        {"\"user\":\"alice\"", "\"user\":null"},
        {"\"user\":\"alice\"", "\"user\":[\"alice\"]"},
        {"\"user\":\"alice\"", "\"user\":\"al\\u0000ice\""},
        {"\"user\":\"alice\"", "\"user\":\"al\\nice\""},
        {"\"user\":\"alice\"", "\"name\":\"alice\""},
        {"\"uid\":61001", "\"uid\":-1"},
        {"\"uid\":61001", "\"uid\":4294967295"},
        {"\"uid\":61001", "\"uid\":1e99"},
        {"\"uid\":61001", "\"uid\":\"61001\""},
        {"\"created\":1700000000", "\"created\":-5"},
        {"\"token\":\"a", "\"token\":\""},
        {"\"token\":\"a", "\"token\":\"A"},
        {"\"options\":{", "\"options\":[{"},
        {"\"timeout\":30", "\"timeout\":1441"},
        {"\"timeout\":30", "\"timeout\":-1"},
        {"\"skipCheckIP\":true", "\"skipCheckIP\":1"},
        {"\"app\":\"an app\"", "\"app\":{}"},
        {"{", "[{"},
    };
    for (const auto& [part, other] : alterations) {
        reference::Session session;
        session.user = "before";
        EXPECT_FALSE(reference::ParseSession(Altered(part, other), session)) << other;
        EXPECT_EQ(session.user, "before");
    }
}

TEST(SessionText, RefusesAUserNameThatNoBufferHolds) {
    reference::Session session = FullSession();
    session.user = std::string(reference::kLongestUserName, 'x');
    reference::Session read;
    EXPECT_TRUE(reference::ParseSession(reference::WriteSession(session), read));
    session.user += 'x';
    EXPECT_FALSE(reference::ParseSession(reference::WriteSession(session), read));
}

TEST(SessionText, NeverThrowsForAwkwardTexts) {
    for (const std::string& text :
         {std::string("null"), std::string("{}"), std::string("[]"), std::string("1"), std::string("\"x\""),
          std::string(100000, '['), std::string(100000, '{'), std::string("{\"options\":1}"), std::string("\0", 1)}) {
        reference::Session session;
        EXPECT_NO_THROW(EXPECT_FALSE(reference::ParseSession(text, session)));
    }
}

TEST(SessionId, IsSixtyFourLowerCaseHexDigits) {
    EXPECT_TRUE(reference::IsSessionId(std::string(64, 'f')));
    for (const std::string& id :
         {std::string(), std::string(63, 'a'), std::string(65, 'a'), std::string(64, 'A'), std::string(64, 'g'),
          std::string(64, '/'), std::string(64, '.'), std::string(64, '\0'), std::string(63, 'a') + "\n",
          "../" + std::string(61, 'a'), std::string(65536, 'a')}) {
        EXPECT_FALSE(reference::IsSessionId(id)) << id.substr(0, 70);
    }
}

TEST(SessionId, FreshOnesDifferAndHaveTheForm) {
    const std::string first = reference::MakeSecret();
    EXPECT_TRUE(reference::IsSessionId(first));
    EXPECT_NE(first, reference::MakeSecret());
}

TEST(SessionId, ComparesWholeSecrets) {
    EXPECT_TRUE(reference::EqualSecrets("abc", "abc"));
    EXPECT_TRUE(reference::EqualSecrets("", ""));
    for (const char* other : {"", "ab", "abcd", "abd", "xbc"}) {
        EXPECT_FALSE(reference::EqualSecrets("abc", other)) << other;
    }
}

TEST(Cookies, GivesTheLastOfTheNameAsItStands) {
    EXPECT_EQ(reference::FindCookie("a=1; id=X; b=2", "id"), "X");
    EXPECT_EQ(reference::FindCookie("id=X; id=Y", "id"), "Y");
    EXPECT_EQ(reference::FindCookie("abandoned=X; id=Y%20", "id"), "Y%20");
    EXPECT_EQ(reference::FindCookie("id=a=b", "id"), "a=b");
    EXPECT_EQ(reference::FindCookie("  id=X\t;", "id"), "X");
}

TEST(Cookies, FindsNothingInOtherForms) {
    for (const char* header : {"", ";", "id", "id;=", "xid=1", "id =1", "ID=1", ";;;=;;"}) {
        EXPECT_EQ(reference::FindCookie(header, "id"), "") << header;
    }
    const std::string lots(1 << 20, ';');
    EXPECT_EQ(reference::FindCookie(lots + "id=X", "id"), "X");
}

TEST(Language, MapsCodesAndTheFirstTag) {
    EXPECT_STREQ(reference::LanguageByCode("deu"), "deu");
    for (const char* code : {"", "DEU", "../", "deu ", "xxx", "deux"}) {
        EXPECT_EQ(reference::LanguageByCode(code), nullptr) << code;
    }
    EXPECT_STREQ(reference::LanguageByHeader("de-AT,en;q=0.9"), "deu");
    EXPECT_STREQ(reference::LanguageByHeader("zh-TW"), "cht");
    EXPECT_STREQ(reference::LanguageByHeader("zh-Hans-CN"), "chs");
    EXPECT_STREQ(reference::LanguageByHeader("pt-BR"), "ptb");
    EXPECT_STREQ(reference::LanguageByHeader("pt;q=1"), "ptg");
    for (const std::string& header : {std::string(), std::string("*"), std::string("dex"), std::string("d"),
                                      std::string(",de"), std::string(100000, 'e'), std::string("e\xff")}) {
        EXPECT_EQ(reference::LanguageByHeader(header), nullptr) << header.substr(0, 20);
    }
}

TEST(ClientAddress, IsThePeerUnlessThatIsAProxy) {
    EXPECT_EQ(reference::ClientAddress("192.0.2.9", "203.0.113.5", ""), "192.0.2.9");
    EXPECT_EQ(reference::ClientAddress("192.0.2.9", "203.0.113.5", "192.0.2.8, 198.51.100.0/24"), "192.0.2.9");
    EXPECT_EQ(reference::ClientAddress("192.0.2.9", "203.0.113.5", "192.0.2.9"), "203.0.113.5");
    EXPECT_EQ(reference::ClientAddress("::ffff:192.0.2.9", "2001:DB8::1", "192.0.2.0/24"), "2001:db8::1");
}

TEST(ClientAddress, BelievesOnlyTheHopsBehindTrustedProxies) {
    constexpr const char* kProxies = "10.0.0.0/8";
    EXPECT_EQ(reference::ClientAddress("10.0.0.1", "1.1.1.1, 203.0.113.5, 10.0.0.2", kProxies), "203.0.113.5");
    EXPECT_EQ(reference::ClientAddress("10.0.0.1", "", kProxies), "10.0.0.1");
    EXPECT_EQ(reference::ClientAddress("10.0.0.1", "10.0.0.3", kProxies), "10.0.0.3");
    EXPECT_EQ(reference::ClientAddress("10.0.0.1", "203.0.113.5, evil", kProxies), "10.0.0.1");
    EXPECT_EQ(reference::ClientAddress("10.0.0.1", "1.1.1.1, x, 10.0.0.2", kProxies), "10.0.0.2");
    EXPECT_EQ(reference::ClientAddress("10.0.0.1", ",,,", kProxies), "10.0.0.1");
    EXPECT_EQ(reference::ClientAddress("10.0.0.1", "203.0.113.5:80", kProxies), "10.0.0.1");
}

TEST(ClientAddress, IsNothingForAPeerThatIsNoAddress) {
    for (const char* peer : {"", "localhost", "1.2.3", "1.2.3.4 ", "[::1]", "fe80::1%eth0", "999.1.1.1"}) {
        EXPECT_EQ(reference::ClientAddress(peer, "203.0.113.5", "0.0.0.0/0"), "") << peer;
    }
}
