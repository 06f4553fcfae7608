#pragma once

#include <cstdlib>
#include <string>

#include "DeviceTest.h"
#include "WebCall.h"
#include "webapi/Json.h"

namespace unit {

/** "ZOVA.Test.Good" open to sharing links, and a link "hash" of the project "sharing_check". */
class SharingTest : public DeviceTest {
protected:
    SharingTest() {
        for (const char* name : {"HTTP_COOKIE", "HTTP_X_FAKE_SHARING", "ZOVA_WEBAPI_USERNAME", "APPARMOR_HAT_ARRAY"}) {
            unsetenv(name);
        }
        const char* open = R"({"allowSharing": true, "grantable": true})";
        Json::Value methods = J(R"(["closed", {"unchecked": {"allowSharing": true, "skipSharingAppCheck": true}}])");
        for (const char* name :
             {"success", "session", "refused", "refused_with_error", "throws", "throws_int", "no_function", "no_row"}) {
            Json::Value method(Json::objectValue);
            method[name] = J(open);
            methods.append(method);
        }
        Good()["authLevel"] = 1;
        Good()["methods"]["1"] = methods;
        Good()["methods"]["2"] = methods;
        Install();
        platform.redirects["/usr/lib/sharing/permission_lib"] = UNIT_LIBRARY_DIR;
        Link().projectName = "sharing_check";
    }

    ZOVA::sharing::record::Entry& Link() { return platform.sharingEntries["hash"]; }

    /** Makes the entry's call one of version 1 through the link. */
    void Prepare(TestWebEntry& entry, const std::string& method, const std::string& cookie = "sharing_sid=s") {
        if (prepared != &entry) {
            entry.Initialize(Json::Value());
            prepared = &entry;
        }
        Json::Value environ(Json::objectValue);
        environ["HTTP_X_FAKE_SHARING"] = "hash";
        environ["HTTP_COOKIE"] = cookie;
        entry.Request()->InitEnv(environ);
        Json::Value params = J(R"({"getParam": {"api": "ZOVA.Test.Good", "version": 1}})");
        params["getParam"]["method"] = method;
        entry.Request()->InitParam(params, true);
        entry.InitLibDesc(entry.Descriptions(), "ZOVA.Test.Good");
        EXPECT_TRUE(entry.AddAPIInfo(entry.Request()));
        platform.calls.clear();
    }

    /** The entry whose one initialisation is done. */
    const TestWebEntry* prepared = nullptr;

    static WebCall Visit(const std::string& method) {
        return WebCall::Get("api=ZOVA.Test.Good&version=1&method=" + method).With("HTTP_X_FAKE_SHARING", "hash");
    }
};

}  // namespace unit
