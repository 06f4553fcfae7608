#include "SessionFixture.h"

namespace {

using CgiRecord = SessionTest;

}  // namespace

TEST_F(CgiRecord, StartsWithTheDevicesSettings) {
    {
        Record record;
        EXPECT_EQ(record.cgi.sessDir, InRoot("/run/zova/sessions"));
        EXPECT_EQ(record.cgi.timeout, 15);
        EXPECT_EQ(record.cgi.skipCheckIP, 0);
        EXPECT_EQ(record.cgi.sessFile, nullptr);
    }
    WriteFile(InRoot("/etc/zovainfo.conf"), "login_idle_minutes=\"30\"\nskip_ip_checking=\"yes\"\n");
    Record record;
    EXPECT_EQ(record.cgi.timeout, 30);
    EXPECT_EQ(record.cgi.skipCheckIP, 1);
}

TEST_F(CgiRecord, TakesTheDefaultForABadIdleTime) {
    for (const char* value : {"", "0", "-1", "1441", "99999999999999999999", "15m", " 20"}) {
        WriteFile(InRoot("/etc/zovainfo.conf"), std::string("login_idle_minutes=\"") + value + "\"\n");
        EXPECT_EQ(Record().cgi.timeout, 15) << value;
        EXPECT_EQ(QLIBCConfGetZELMTimeout(), 15) << value;
    }
}

TEST_F(CgiRecord, IgnoresSettingsThatOthersCanWrite) {
    WriteFile(InRoot("/etc/zovainfo.conf"), "skip_ip_checking=\"yes\"\n");
    ASSERT_EQ(chmod(InRoot("/etc/zovainfo.conf").c_str(), 0666), 0);
    EXPECT_EQ(Record().cgi.skipCheckIP, 0);
}

TEST_F(CgiRecord, IsFreedOnceAndForAll) {
    ZovaCgi cgi{};
    ASSERT_EQ(ZovaCgiInit("", &cgi), 0);
    ZovaCgiLoadInCookies(&cgi);
    ZovaCgiFree(&cgi);
    EXPECT_EQ(cgi.sessDir, nullptr);
    EXPECT_EQ(cgi.state, nullptr);
    ZovaCgiFree(&cgi);
    ZovaCgiFree(nullptr);
    EXPECT_LT(ZovaCgiInit("", nullptr), 0);
    EXPECT_LT(ZovaCgiInitEx(nullptr, 1, 0, "", ""), 0);
    ZovaCgiLoadInCookies(nullptr);
}

TEST_F(CgiRecord, OutsideARequestTakesTheGivenIdleTimeIfItIsOne) {
    for (const auto& [given, taken] : {std::pair(20, 20), std::pair(0, 15), std::pair(-1, 15), std::pair(99999, 15)}) {
        ZovaCgi cgi{};
        ASSERT_EQ(ZovaCgiInitEx(&cgi, given, 0, "current.users", ""), 0);
        EXPECT_EQ(cgi.timeout, taken);
        EXPECT_STREQ(ZovaCgiGetLang(&cgi), "enu");
        ZovaCgiFree(&cgi);
    }
}

TEST_F(CgiRecord, TakesTheLanguageFromCookieThenHeaderThenDefault) {
    struct Row {
        const char* cookie;
        const char* header;
        const char* expected;
    };
    for (const Row& row : {Row{"lang=fra; ui_language=ita", "de", "fra"}, Row{"ui_language=ita", "de", "ita"},
                           Row{"lang=../../x", "de", "deu"}, Row{nullptr, "nl-BE,nl", "nld"}, Row{"lang=", "xx", "enu"},
                           Row{nullptr, nullptr, "enu"}}) {
        const ScopedVariable cookie("HTTP_COOKIE", row.cookie);
        const ScopedVariable header("HTTP_ACCEPT_LANGUAGE", row.header);
        Record record;
        EXPECT_STREQ(ZovaCgiGetLang(&record.cgi), row.expected);
    }
    EXPECT_STREQ(ZovaCgiGetLang(nullptr), "enu");
}

TEST_F(CgiRecord, SeesCookiesThatChangedWhenReadAgain) {
    const Login plain = LogIn();
    const Login guarded = LogIn("alice", true);
    const ScopedVariable first("HTTP_COOKIE", ("id=" + plain.sid).c_str());
    Record record;
    EXPECT_EQ(ZovaCgiIsTokenEnable(&record.cgi), 0);
    const ScopedVariable second("HTTP_COOKIE", ("abandoned=" + plain.sid + "; id=" + guarded.sid).c_str());
    ZovaCgiLoadInCookies(&record.cgi);
    EXPECT_EQ(ZovaCgiIsTokenEnable(&record.cgi), 1);
}

TEST_F(CgiRecord, HasNoTokenWithoutAKnownSession) {
    for (const std::string& cookie : {std::string(), std::string("id="), std::string("id=../../x"),
                                      "id=" + std::string(64, '0'), "id=" + std::string(65536, 'a')}) {
        const ScopedVariable header("HTTP_COOKIE", cookie.c_str());
        Record record;
        EXPECT_EQ(ZovaCgiIsTokenEnable(&record.cgi), 0);
    }
    EXPECT_EQ(ZovaCgiIsTokenEnable(nullptr), 0);
}

TEST_F(CgiRecord, TellsTheClientsAddress) {
    char buffer[65] = "before";
    EXPECT_EQ(ZovaCgiGetRemoteIP(buffer, sizeof(buffer)), 0);
    EXPECT_STREQ(buffer, kClient);
    EXPECT_LT(ZovaCgiGetRemoteIP(buffer, 9), 0);
    EXPECT_EQ(ZovaCgiGetRemoteIP(buffer, 10), 0);
    EXPECT_LT(ZovaCgiGetRemoteIP(nullptr, 65), 0);
    EXPECT_LT(ZovaCgiGetRemoteIP(buffer, 0), 0);
    for (const char* other : {static_cast<const char*>(nullptr), "", "evil\r\nX: y"}) {
        const ScopedVariable none("REMOTE_ADDR", other);
        EXPECT_LT(ZovaCgiGetRemoteIP(buffer, sizeof(buffer)), 0);
    }
}

TEST_F(CgiRecord, BelievesForwardedAddressesOfConfiguredProxiesOnly) {
    const ScopedVariable forwarded("HTTP_X_FORWARDED_FOR", "203.0.113.5");
    char buffer[65];
    ASSERT_EQ(ZovaCgiGetRemoteIP(buffer, sizeof(buffer)), 0);
    EXPECT_STREQ(buffer, kClient);
    WriteFile(InRoot("/etc/zovainfo.conf"), "trusted_proxies=\"127.0.0.1, 192.0.2.0/24\"\n");
    ASSERT_EQ(ZovaCgiGetRemoteIP(buffer, sizeof(buffer)), 0);
    EXPECT_STREQ(buffer, "203.0.113.5");
}
