// Whether granted scopes open a call.

#include "auth/ScopeFilter.h"

#include "FrameworkTest.h"
#include "webapi/APIRequest.h"

using unit::J;
using ZOVA::APIRequest;
using ZOVA::ScopesCover;

namespace {

class ScopeTest : public unit::FrameworkTest {
protected:
    ScopeTest() {
        request.InitParam(J(R"({"getParam": {"api": "ZOVA.Core.User", "version": 2, "method": "get", "name": "bob",
            "count": 5, "list": [1, 2], "none": null, "text": "5", "empty": ""}})"),
                          true);
    }

    bool Cover(const std::string& scopes, const std::string& granted = "read") {
        return ScopesCover(J(scopes), granted, request);
    }
    bool LineCovers(const std::string& line) {
        Json::Value scopes = J(R"([{"id": "read", "apis": [{"params": []}]}])");
        scopes[0]["apis"][0]["params"].append(line);
        return ScopesCover(scopes, "read", request);
    }

    APIRequest request{Json::Value()};
};

// ---- one line ----

struct LineCase {
    const char* name;
    const char* line;
    bool covers;
};

class ScopeLine : public ScopeTest, public ::testing::WithParamInterface<LineCase> {};

TEST_P(ScopeLine, OpensTheCallIfEveryMemberPasses) {
    EXPECT_EQ(LineCovers(GetParam().line), GetParam().covers) << GetParam().line;
}

INSTANTIATE_TEST_SUITE_P(
    Rows, ScopeLine,
    ::testing::Values(
        LineCase{"ApiPrefix", "api=ZOVA.Core.", true}, LineCase{"WholeApi", "api=ZOVA.Core.User", true},
        LineCase{"LongerApi", "api=ZOVA.Core.User.X", false}, LineCase{"ApiInTheMiddle", "api=Core.User", false},
        LineCase{"ApiThatIsNoText", "api=5", false}, LineCase{"ApiWithVersion", "api=ZOVA.&version=2", true},
        LineCase{"AnotherVersion", "api=ZOVA.&version=1", false}, LineCase{"VersionAlone", "version=2", true},
        LineCase{"VersionAsText", "version=\"2\"", false}, LineCase{"VersionThatIsNoNumber", "version=2x", false},
        LineCase{"EmptyVersion", "version=", false}, LineCase{"VersionTrue", "version=true", false},
        LineCase{"VersionBeyondAnInt", "version=4294967298", false}, LineCase{"Method", "method=get", true},
        LineCase{"MethodPrefix", "method=ge", false}, LineCase{"AnotherMethod", "method=set", false},
        LineCase{"MethodInQuotes", "method=\"get\"", true}, LineCase{"MethodThatIsNoText", "method=null", false},
        LineCase{"Parameter", "name=bob", true}, LineCase{"AnotherValue", "name=bo", false},
        LineCase{"AbsentParameter", "nobody=bob", false}, LineCase{"AbsentParameterOfAnyValue", "nobody=null", false},
        LineCase{"AnyValueByNull", "name=null", true}, LineCase{"AnyValueByArray", "name=[]", true},
        LineCase{"AnyValueByObject", "name={}", true}, LineCase{"AnEmptyTextIsAValue", "name=", false},
        LineCase{"AnEmptyTextEqualsOne", "empty=", true}, LineCase{"Number", "count=5", true},
        LineCase{"NumberAsText", "count=\"5\"", false}, LineCase{"TextAsNumber", "text=5", false},
        LineCase{"Array", "list=[1,2]", true}, LineCase{"AnotherArray", "list=[2,1]", false},
        LineCase{"NullIsThere", "none=null", true}, LineCase{"NullIsNoText", "none=x", false},
        LineCase{"All", "api=ZOVA.Core.User&version=2&method=get&name=bob", true},
        LineCase{"AllButOne", "api=ZOVA.Core.User&version=2&method=get&name=alice", false},
        LineCase{"Empty", "", false}, LineCase{"NoPair", "&&", false}, LineCase{"NotDecoded", "name=b%6fb", false},
        LineCase{"EmptyName", "=x", false}),
    [](const auto& row) { return std::string(row.param.name); });

// ---- granted scopes ----

TEST_F(ScopeTest, OnlyTheGrantedIdsOpenAnything) {
    const std::string scopes = R"([{"id": "read", "apis": [{"params": ["version=2"]}]}])";
    for (const char* granted : {"read", "read write", "write read", "a read b"}) {
        EXPECT_TRUE(Cover(scopes, granted)) << granted;
    }
    for (const char* granted : {"write", "readonly", "rea", "xread", "read,write", "Read", "", " "}) {
        EXPECT_FALSE(Cover(scopes, granted)) << granted;
    }
}

TEST_F(ScopeTest, AScopeWithoutAnIdIsNeverGranted) {
    for (const char* scope :
         {R"({"apis": [{"params": ["version=2"]}]})", R"({"id": "", "apis": [{"params": ["version=2"]}]})",
          R"({"id": null, "apis": [{"params": ["version=2"]}]})"}) {
        EXPECT_FALSE(Cover(std::string("[").append(scope).append("]"), "a  b")) << scope;
    }
}

TEST_F(ScopeTest, TheFirstFilterOfAnyGrantedScopeThatPassesIsEnough) {
    EXPECT_TRUE(Cover(R"([{"id": "write", "apis": [{"params": ["method=set"]}]},
        {"id": "read", "apis": [{"params": ["method=x"]}, {"params": ["method=y", "method=get"]}]}])",
                      "write read"));
}

TEST_F(ScopeTest, ARecordWithAnEndpointOpensNothingHere) {
    for (const char* endpoint : {R"("https://other.example/")", R"("x")", "5", "{}", "[]", "true"}) {
        EXPECT_FALSE(Cover(R"([{"id": "read", "apis": [{"params": ["version=2"], "endpoint": )" +
                           std::string(endpoint) + "}]}]"))
            << endpoint;
    }
    for (const char* endpoint : {R"("")", "null"}) {
        EXPECT_TRUE(Cover(R"([{"id": "read", "apis": [{"params": ["version=2"], "endpoint": )" + std::string(endpoint) +
                          "}]}]"))
            << endpoint;
    }
}

TEST_F(ScopeTest, WhatHasAnotherFormOpensNothing) {
    for (const char* scopes :
         {"null", "5", R"("read")", "{}", "[]", "[null, 5, []]",
          R"({"x": {"id": "read", "apis": [{"params": ["version=2"]}]}})", R"([{"id": "read"}])",
          R"([{"id": "read", "apis": null}])", R"([{"id": "read", "apis": "x"}])",
          R"([{"id": "read", "apis": {"x": {"params": ["version=2"]}}}])",
          R"([{"id": "read", "apis": [5, null, "version=2"]}])", R"([{"id": "read", "apis": [{}]}])",
          R"([{"id": "read", "apis": [{"params": "version=2"}]}])",
          R"([{"id": "read", "apis": [{"params": {"a": "version=2"}}]}])",
          R"([{"id": "read", "apis": [{"params": [null, 5, ["version=2"], {"version": 2}]}]}])"}) {
        EXPECT_FALSE(Cover(scopes)) << scopes;
    }
}

TEST_F(ScopeTest, ALineThatCannotBeParsedIsSkippedAndTheNextIsTried) {
    platform.Fail("strPairToJsonObj", EINVAL, 0, 1);
    EXPECT_TRUE(Cover(R"([{"id": "read", "apis": [{"params": ["version=2", "method=get"]}]}])"));
    EXPECT_EQ(platform.CountOf("strPairToJsonObj"), 2);
}

}  // namespace
