#pragma once

#include <string>

#include "PrivateDevice.h"
#include "Seam.h"

/** A device on which sessions can be made, with a client at `kClient`. */
class SessionTest : public DeviceTest {
protected:
    static constexpr const char* kClient = "192.0.2.7";
    static constexpr int kAllFlags = 31;

    SessionTest() : peer("REMOTE_ADDR", kClient) {}

    struct Login {
        std::string sid;
        std::string token;
    };

    static Login LogIn(const char* user = "alice", bool withToken = false, bool skipCheckIp = false) {
        const ZovaLoginOptions options = {kClient, "app", "webapi", withToken ? 1 : 0, skipCheckIp ? 1 : 0};
        char sid[65] = "";
        char token[65] = "";
        EXPECT_EQ(ZovaSessionCreate(user, &options, sid, sizeof(sid), token, sizeof(token)), 0);
        return {sid, token};
    }

    static std::string FileOf(const std::string& sid) { return InRoot("/run/zova/sessions/") + sid; }

private:
    ScopedVariable peer;
};

/** A CGI context record as a request has it. */
class Record {
public:
    Record() {
        EXPECT_EQ(ZovaCgiInit("", &cgi), 0);
        ZovaCgiLoadInCookies(&cgi);
    }
    Record(const Record&) = delete;
    Record& operator=(const Record&) = delete;
    ~Record() { ZovaCgiFree(&cgi); }

    int Check(const std::string& sid, int flags = 31, bool allowTimeout = false) {
        const ZovaCgiAuthOptions options = {flags, allowTimeout ? 1 : 0};
        return ZovaCgiIsAuthorizedEx(&cgi, sid.c_str(), user, sizeof(user), &options, 0);
    }

    ZovaCgi cgi{};
    char user[493] = "before";
};
