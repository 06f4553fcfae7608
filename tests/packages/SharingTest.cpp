#include <gtest/gtest.h>

#include "../../packages/ZOVA.Core.Sharing.Visit/OpenLink.h"
#include "../../packages/ZOVA.Core.Sharing/LinkMethods.h"
#include "../../packages/common/PlatformSharing.h"
#include "Call.h"
#include "FakeLinks.h"

namespace {

using Texts = std::vector<std::string>;

Json::Value InitOf(const std::string& parameters) {
    Json::Value init(Json::objectValue);
    init["session"]["username"] = "alice";
    init["environ"]["HTTP_HOST"] = "nas";
    init["environ"]["REQUEST_URI"] = "/webapi/front.cgi";
    init["environ"]["ZOVA_REMOTE_IP"] = "192.0.2.7";
    init["postParam"] = Parse(parameters);
    return init;
}

class Sharing : public testing::Test {
protected:
    static Call Send(Call::Method method, const std::string& parameters) { return Call(method, InitOf(parameters)); }

    FakeLinks& fake = FakeLinks::Renew();
};

// ---- owners ----

TEST_F(Sharing, LinkIsMadeOfTheFieldsAmongTheParametersInTheCallersName) {
    const Call call = Send(package::CreateLink, R"({"project":"files","paths":["/a"],"protect_type":1,"password":"p",
        "users":["u"],"addresses":[],"match_ip":true,"expires":5,"visit_limit":6,"enabled":false,"user":"admin",
        "owner":"admin","hash":"x"})");
    EXPECT_EQ(call.Data()["hash"].asString(), "h1");
    EXPECT_EQ(call.Data()["url"].asString(), "http://nas/sharing/h1");
    EXPECT_EQ(fake.calls,
              Texts{R"(create alice {"addresses":[],"enabled":false,"expires":5,"match_ip":true,"password":"p",)"
                    R"("paths":["/a"],"project":"files","protect_type":1,"users":["u"],"visit_limit":6})"});
}

TEST_F(Sharing, PasswordOfDigitsIsAText) {
    Send(package::CreateLink, R"({"project":"files","paths":["/a"],"protect_type":1,"password":1234})");
    Send(package::UpdateLink, R"({"hash":"h","password":12})");
    EXPECT_EQ(fake.calls,
              (Texts{R"(create alice {"password":"1234","paths":["/a"],"project":"files","protect_type":1})",
                     R"(update alice h {"password":"12"})"}));
}

TEST_F(Sharing, LinkIsShownWithItsUrlAndPathsThatAreUtf8) {
    const Json::Value link = Send(package::GetLink, R"({"hash":"h2"})").Data();
    EXPECT_EQ(link["url"].asString(), "http://nas/sharing/h2");
    EXPECT_EQ(link["paths"][0].asString(), "/a");
    EXPECT_NE(link["paths"][1].asString(), "/\xff");
    EXPECT_EQ(Send(package::ListLinks, "{}").Data()["links"].size(), 1U);
    EXPECT_EQ(fake.calls, (Texts{"get alice h2", "list alice"}));
}

TEST_F(Sharing, LinkHasNoUrlWhereItCannotBeTold) {
    Json::Value init = InitOf(R"({"hash":"h2"})");
    init["environ"]["HTTP_HOST"] = "na s";
    EXPECT_EQ(Call(package::GetLink, init).Data()["url"].asString(), "");
}

TEST_F(Sharing, LinkIsChangedAndRemoved) {
    EXPECT_EQ(Send(package::UpdateLink, R"({"hash":"h","enabled":false})").Body(), R"({"success":true})");
    EXPECT_EQ(Send(package::DeleteLink, R"({"hash":"h"})").Body(), R"({"success":true})");
    EXPECT_EQ(fake.calls, (Texts{R"(update alice h {"enabled":false})", "delete alice h"}));
}

TEST_F(Sharing, LinkKeepsItsProject) {
    EXPECT_EQ(Send(package::UpdateLink, R"({"hash":"h","project":"other"})").Body(), RefusalOf("project"));
    EXPECT_TRUE(fake.calls.empty());
}

TEST_F(Sharing, MethodsAnswerWhatThePlatformSays) {
    const auto error = [](int code) { return R"({"error":{"code":)" + std::to_string(code) + R"(},"success":false})"; };
    const std::pair<int, std::string> rows[] = {{ZOVA_LINK_BAD_FIELD, RefusalOf("enabled")},
                                                {ZOVA_LINK_BAD_PROJECT, RefusalOf("project")},
                                                {ZOVA_LINK_BAD_PATHS, RefusalOf("paths")},
                                                {ZOVA_LINK_BAD_PROTECTION, RefusalOf("protect_type")},
                                                {ZOVA_LINK_BAD_ADDRESSES, RefusalOf("addresses")},
                                                {ZOVA_LINK_BAD_TIME, RefusalOf("expires")},
                                                {ZOVA_LINK_BAD_LIMIT, RefusalOf("visit_limit")},
                                                {ZOVA_LINK_NO_USER, error(401)},
                                                {ZOVA_LINK_UNKNOWN, error(402)},
                                                {ZOVA_LINK_TOO_MANY, error(403)},
                                                {ZOVA_LINK_FAILED, error(117)},
                                                {-1, error(117)}};
    for (const auto& [result, body] : rows) {
        fake.result = result;
        for (const Call::Method method :
             {package::CreateLink, package::GetLink, package::ListLinks, package::UpdateLink, package::DeleteLink}) {
            EXPECT_EQ(Send(method, R"({"hash":"h"})").Body(), body);
        }
    }
}

TEST_F(Sharing, HashThatIsNoTextIsRefused) {
    for (const char* parameters :
         {"{}", R"({"hash":null})", R"({"hash":7})", R"({"hash":["h"]})", R"({"hash":"h\u0000"})"}) {
        for (const Call::Method method : {package::GetLink, package::UpdateLink, package::DeleteLink}) {
            EXPECT_EQ(Send(method, parameters).Body(), RefusalOf("hash")) << parameters;
        }
    }
    EXPECT_TRUE(fake.calls.empty());
}

// ---- visitors ----

TEST_F(Sharing, VisitIsOpenedWithTheClientsAddressAndHandsTheSessionOutInACookie) {
    const Call call = Send(package::OpenLink, R"({"hash":"h","user":"bob","password":"p"})");
    EXPECT_EQ(call.Body(), R"({"data":{"expires":1000},"success":true})");
    EXPECT_EQ(fake.calls, Texts{"open h [bob] [p] from 192.0.2.7"});
    EXPECT_NE(call.Cookies().find("sharing_sid=5e55"), std::string::npos) << call.Cookies();
    EXPECT_NE(call.Cookies().find("SameSite=Lax"), std::string::npos) << call.Cookies();
    EXPECT_EQ(call.Cookies().find("ecure"), std::string::npos) << call.Cookies();
}

TEST_F(Sharing, VisitByHttpsGetsASecureCookie) {
    Json::Value init = InitOf(R"({"hash":"h"})");
    init["environ"]["HTTPS"] = "on";
    EXPECT_NE(Call(package::OpenLink, init).Cookies().find("ecure"), std::string::npos);
}

TEST_F(Sharing, VisitThatNeedsNoSessionGetsNoCookie) {
    fake.sid = "";
    const Call call = Send(package::OpenLink, R"({"hash":"h"})");
    EXPECT_EQ(call.Body(), R"({"data":{},"success":true})");
    EXPECT_EQ(call.Cookies().find("sharing_sid"), std::string::npos);
    EXPECT_EQ(fake.calls, Texts{"open h [] [] from 192.0.2.7"});
}

TEST_F(Sharing, VisitTakesNumbersForTheTextOfTheirDigits) {
    Send(package::OpenLink, R"({"hash":12345678901234567890,"user":7,"password":1234})");
    EXPECT_EQ(fake.calls, Texts{"open 12345678901234567890 [7] [1234] from 192.0.2.7"});
}

TEST_F(Sharing, VisitAnswersWhatThePlatformSays) {
    const std::pair<int, int> rows[] = {{ZOVA_LINK_REFUSED, 400}, {ZOVA_LINK_UNKNOWN, 402}, {ZOVA_LINK_TOO_MANY, 403},
                                        {ZOVA_LINK_BLOCKED, 407}, {ZOVA_LINK_FAILED, 117},  {-1, 117}};
    for (const auto& [result, code] : rows) {
        fake.result = result;
        const Call call = Send(package::OpenLink, R"({"hash":"h"})");
        EXPECT_EQ(call.Error(), code);
        EXPECT_EQ(call.Cookies().find("sharing_sid"), std::string::npos);
    }
}

TEST_F(Sharing, VisitWithWhatIsNoTextIsRefused) {
    for (const char* name : {"hash", "user", "password"}) {
        for (const std::string& value :
             {std::string("null"), std::string("1.5"), std::string("true"), std::string("[]"),
              std::string(R"("a\u0000b")"), std::string(R"("a\nb")"), "\"" + std::string(512, 'a') + "\""}) {
            EXPECT_EQ(Send(package::OpenLink, std::string("{\"") + name + "\":" + value + "}").Body(), RefusalOf(name))
                << name << value;
        }
    }
    EXPECT_TRUE(fake.calls.empty());
}

}  // namespace
