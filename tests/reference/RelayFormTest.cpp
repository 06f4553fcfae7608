#include <limits>

#include "PrivateDevice.h"
#include "Seam.h"
#include "common/JsonText.h"
#include "webapi/FormDecoder.h"
#include "webapi/TypedValue.h"
#include "zovacredential/RelayForm.h"

namespace {

using reference::CallForm;
using reference::RelayCall;
using reference::TypedText;

const RelayCall kCall{"ZOVA.Core.User", 1, "get"};

Json::Value Parsed(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(reference::ParseJson(text, value)) << text;
    return value;
}

/** The parameters as the peer's intake finds them. */
Json::Value AtThePeer(const Json::Value& params) {
    Json::Value out;
    EXPECT_TRUE(ZOVA::WebAPIUtil::strPairToJsonObj(CallForm(kCall, "token", params), out, true, true));
    for (const char* name : {"tid", "api", "version", "method"}) {
        EXPECT_TRUE(out.isMember(name)) << name;
        out.removeMember(name);
    }
    return out;
}

}  // namespace

TEST(RelayForm, QuotesATextOnlyIfItWouldBeReadAsAnotherValue) {
    const std::pair<std::string, std::string> rows[] = {{"hello", "hello"},
                                                        {"", ""},
                                                        {"1", "\"1\""},
                                                        {"-0.5e3", "\"-0.5e3\""},
                                                        {"true", "\"true\""},
                                                        {"null", "\"null\""},
                                                        {"[1]", "\"[1]\""},
                                                        {"{}", "\"{}\""},
                                                        {"\"quoted\"", "\"\\\"quoted\\\"\""},
                                                        {"-", "-"},
                                                        {"1a", "1a"},
                                                        {"[1]x", "[1]x"},
                                                        {"01", "01"},
                                                        {" 1", " 1"},
                                                        {"\"", "\""},
                                                        {"1e999", "1e999"}};
    for (const auto& [text, expected] : rows) {
        EXPECT_EQ(TypedText(text), expected) << text;
        EXPECT_EQ(reference::TypedValue(TypedText(text)), Json::Value(text)) << text;
    }
}

TEST(RelayForm, BringsEveryParameterToThePeerAsTheValueThatItIs) {
    Json::Value params = Parsed(R"({"number":5,"negative":-9223372036854775808,"large":18446744073709551615,
        "real":0.1,"whole":2.0,"tiny":5e-324,"yes":true,"no":false,"nothing":null,"text":"a b&c=d+e%f","digits":"1",
        "json":"{\"a\":[1,\"2\"]}","list":[1,"1",true,null,[],{}],"object":{"a":{"b":"c\"d\\"}},"empty":"",
        "utf8":"gr\u00fc\u00df 😀","control":"\u0001\t\r\n","a name&=+%":"x","":"nameless"})");
    params["nul"] = std::string("a\0b", 3);
    params["quoted nul"] = std::string("\"a\0\"", 4);
    params["not utf-8"] = std::string("\xff\xfe\"");
    params["quoted, not utf-8"] = std::string("\"\xff\"");
    params["list"].append(std::string("\xff"));
    EXPECT_EQ(reference::WriteJson(AtThePeer(params)), reference::WriteJson(params));
    EXPECT_EQ(AtThePeer(params), params);
}

TEST(RelayForm, BringsValuesNestedAsDeepAsTheyCanBeRead) {
    Json::Value params(Json::objectValue);
    params["deep"] = Parsed(std::string(256, '[') + std::string(256, ']'));
    EXPECT_EQ(AtThePeer(params), params);
}

TEST(RelayForm, NamesTheCallOnceAndAsItWasAdmitted) {
    const Json::Value params = Parsed(R"({"api":"ZOVA.Core.Other","version":9,"method":"other","x":1})");
    EXPECT_EQ(CallForm(kCall, "token", params), "tid=token&api=ZOVA.Core.User&version=1&method=get&x=1");
    EXPECT_EQ(CallForm({"1", 2, "true"}, "12"), "tid=%2212%22&api=%221%22&version=2&method=%22true%22");
}

TEST(RelayForm, LeavesOutOtherCredentialsCiphersAndRelays) {
    const Json::Value params = Parsed(R"({"_sid":"s","tid":"t","_oat":"o","_sharing_id":"i","_sharing_sid":"j",
        "__nEkOtReHpIc":"k","__tXeTrEhPiC":"l","__cIpHeRtExT":"m","__cIpHeRtOkEn":"n","relay_zn":1,"relay_timeout":2,
        "SID":"stays","_SID":"stays"})");
    EXPECT_EQ(CallForm(kCall, "token", params),
              "tid=token&api=ZOVA.Core.User&version=1&method=get&SID=stays&_SID=stays");
}

TEST(RelayForm, LeavesOutEnvelopesHoweverDeepTheyStand) {
    const Json::Value params = Parsed(R"({"webapi":{"__cIpHeRtExT":"x","a":1,"webapi":{"__cIpHeRtExT":"y","b":2,
        "webapi":{"__cIpHeRtOkEn":"z","webapi":"__cIpHeRtExT"}}},"other":{"__cIpHeRtExT":"stays"}})");
    EXPECT_EQ(reference::WriteJson(AtThePeer(params)),
              R"({"other":{"__cIpHeRtExT":"stays"},"webapi":{"a":1,"webapi":{"b":2,"webapi":{"webapi":)"
              R"("__cIpHeRtExT"}}}})");
    EXPECT_EQ(reference::WriteJson(AtThePeer(Parsed(R"({"webapi":"text"})"))), R"({"webapi":"text"})");
}

TEST(RelayForm, IsNoEnvelopeItself) {
    const Json::Value params = Parsed(R"({"a":1})");
    EXPECT_EQ(CallForm(kCall, "token", params).find("tid="), 0u);
}
