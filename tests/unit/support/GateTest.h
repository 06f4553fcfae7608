#pragma once

#include <cstdlib>
#include <string>

#include "DeviceTest.h"
#include "WebCall.h"
#include "webapi/Json.h"

namespace unit {

/** "ZOVA.Test.Good" behind a login. */
class GateTest : public DeviceTest {
protected:
    GateTest() {
        unsetenv("HTTP_COOKIE");
        unsetenv("ZOVA_WEBAPI_USERNAME");
        Good()["authLevel"] = 1;
        Good()["methods"]["1"].append(J(R"({"timeout_allowed": {"grantable": true, "allowTimeout": true}})"));
        Good()["methods"]["1"].append(J(R"({"any_address": {"grantable": true, "skipCheckIP": true}})"));
        Install();
    }

    static WebCall Session(const std::string& sid) {
        const WebCall call = WebCall::Get("api=ZOVA.Test.Good&version=1&method=session");
        return sid.empty() ? call : call.With("HTTP_COOKIE", "id=" + sid);
    }

    static void Prepare(TestWebEntry& entry, const std::string& sid, const std::string& method = "session") {
        entry.Initialize(Json::Value());
        entry.Request()->InitEnv(J("{\"HTTP_COOKIE\": \"id=" + sid + "\"}"));
        Json::Value params = J(R"({"getParam": {"api": "ZOVA.Test.Good", "version": 1}})");
        params["getParam"]["method"] = method;
        entry.Request()->InitParam(params, true);
        entry.InitLibDesc(entry.Descriptions(), "ZOVA.Test.Good");
        EXPECT_TRUE(entry.AddAPIInfo(entry.Request()));
    }
};

}  // namespace unit
