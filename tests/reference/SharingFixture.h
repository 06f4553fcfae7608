#pragma once

#include <sys/stat.h>
#include <unistd.h>

#include <ctime>
#include <string>

#include "PrivateDevice.h"
#include "Seam.h"
#include "common/JsonText.h"
#include "zovasharing/Database.h"

/** A folder of alice's to share, and a client at an address of its own. */
class SharingDevice : public DeviceTest {
protected:
    void SetUp() override {
        DeviceTest::SetUp();
        WriteFile(InRoot("/etc/pam.d/zova-webapi"), "auth required pam_unix.so\naccount required pam_unix.so\n");
        WriteFile(Shared() + "/photo.jpg", "a photo");
        GiveTo(Shared(), kAliceUid);
        GiveTo(Shared() + "/photo.jpg", kAliceUid);
    }

    static std::string Shared() { return InRoot("/scratch/album"); }
    static std::string DatabaseFile() { return InRoot("/var/lib/zova/sharing/sharing.db"); }

    static void GiveTo(const std::string& path, uid_t owner) { ASSERT_EQ(lchown(path.c_str(), owner, owner), 0); }

    /** Fields of a good link with these on top. */
    static Json::Value Fields(const std::string& more = "{}") {
        Json::Value fields(Json::objectValue);
        fields["project"] = "files";
        fields["paths"].append(Shared());
        Json::Value others;
        EXPECT_TRUE(reference::ParseJson(more, others)) << more;
        for (const std::string& name : others.getMemberNames()) {
            fields[name] = others[name];
        }
        return fields;
    }

    /** The hash of a new link of alice's. */
    static std::string Create(const std::string& more = "{}") {
        const Json::Value fields = Fields(more);
        Json::Value made;
        EXPECT_EQ(ZovaLinkCreate("alice", &fields, &made), ZOVA_LINK_OK) << more;
        return made["hash"].asString();
    }

    static int Update(const std::string& hash, const std::string& text) {
        Json::Value fields;
        EXPECT_TRUE(reference::ParseJson(text, fields)) << text;
        return ZovaLinkUpdate("alice", hash.c_str(), &fields);
    }

    static int Open(const std::string& hash, const char* password = nullptr, const char* user = nullptr,
                    const char* address = "192.0.2.7") {
        char buffer[65] = "untouched";
        const ZovaLinkVisit visit = {user, password, address};
        const int result = ZovaLinkOpen(hash.c_str(), &visit, buffer, sizeof(buffer), &lastEnd);
        lastSid = buffer;
        return result;
    }

    /** The verdict on a link and a session id from the address. */
    static int Judge(const std::string& hash, const std::string& sid = "", const char* address = "192.0.2.7") {
        const ScopedVariable peer("REMOTE_ADDR", address);
        ZovaSharingCredentials credentials{};
        credentials.sharingId = hash.c_str();
        credentials.sessionId = sid.empty() ? nullptr : sid.c_str();
        return ZovaSharingIsAuthorized(&credentials);
    }

    /** Changes the database behind the library's back. */
    static void Run(const std::string& statement) {
        reference::sharing::Database database;
        ASSERT_TRUE(database.Run(statement.c_str())) << statement;
    }

    static inline std::string lastSid;
    static inline long long lastEnd = 0;
};
