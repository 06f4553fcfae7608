// What a request knows of its sharing link, and the URL of sharing links.

#include "FrameworkTest.h"
#include "webapi/APIRequest.h"
#include "zovasharing.h"

using unit::FrameworkTest;
using unit::J;
using ZOVA::APIRequest;
using Texts = std::vector<std::string>;

namespace {

class SharingContext : public FrameworkTest {
protected:
    SharingContext() {
        platform.sharingEntries["hash"].projectName = "files";
        platform.sharingEntries["hash"].protectType = 1;
        platform.sharingSession.id = 7;
    }

    Texts Asked() const {
        return platform.CallsOf({"SharingDB::Instance", "SharingDB::IsGood", "EntryDB::GetByHash",
                                 "SessionDB::GetBySessionId", "TokenDB::GetBySessionEntry"});
    }

    APIRequest request{Json::Value()};
};

TEST_F(SharingContext, WithoutTheHeaderReadsTheSessionIdAndDoesNotOpenTheDatabase) {
    request.InitEnv(J(R"({"HTTP_COOKIE": "sharing_sid=s"})"));
    EXPECT_FALSE(request.IsSharing());
    EXPECT_EQ(request.GetSharingID(), "");
    EXPECT_EQ(request.GetSharingSID(), "s");
    EXPECT_EQ(request.GetSharingEntry().get_project_name(), "");
    EXPECT_EQ(request.GetSharingEntry().get_protect_type(), 0);
    EXPECT_EQ(request.GetSharingSession().id, 0);
    EXPECT_EQ(request.GetSharingToken().id, 0);
    EXPECT_TRUE(Asked().empty());
}

TEST_F(SharingContext, AsksForLinkSessionAndTokenInThisOrder) {
    request.InitEnv(J(R"({"HTTP_X_FAKE_SHARING": "hash", "HTTP_COOKIE": "a=1; sharing_sid=s"})"));
    EXPECT_TRUE(request.IsSharing());
    EXPECT_EQ(Asked(), (Texts{"SharingDB::Instance()", "SharingDB::IsGood()", "EntryDB::GetByHash(hash)",
                              "SessionDB::GetBySessionId(s)", "TokenDB::GetBySessionEntry(7, hash)"}));
    EXPECT_EQ(request.GetSharingEntry().get_project_name(), "files");
    EXPECT_EQ(request.GetSharingEntry().get_protect_type(), 1);
    EXPECT_EQ(request.GetSharingSession().id, 7);
    EXPECT_EQ(request.GetSharingToken().id, 7);
}

TEST_F(SharingContext, LooksALinkUpWithoutACookieToo) {
    request.InitEnv(J(R"({"HTTP_X_FAKE_SHARING": "hash"})"));
    EXPECT_EQ(request.GetSharingSID(), "");
    EXPECT_EQ(platform.CallsOf({"SessionDB::GetBySessionId"}), (Texts{"SessionDB::GetBySessionId()"}));
}

TEST_F(SharingContext, IsASharingRequestAlsoForAHashThatTheDatabaseDoesNotKnow) {
    request.InitEnv(J(R"({"HTTP_X_FAKE_SHARING": "unknown"})"));
    EXPECT_TRUE(request.IsSharing());
    EXPECT_EQ(request.GetSharingEntry().get_project_name(), "");
}

TEST_F(SharingContext, IsASharingRequestAlsoWithABadDatabaseWhichIsNotAskedFurther) {
    platform.sharingDatabaseGood = false;
    request.InitEnv(J(R"({"HTTP_X_FAKE_SHARING": "hash"})"));
    EXPECT_TRUE(request.IsSharing());
    EXPECT_EQ(request.GetSharingEntry().get_project_name(), "");
    EXPECT_EQ(platform.CountOf("EntryDB::GetByHash"), 0);
}

TEST_F(SharingContext, KeepsEarlierRecordsThoughALaterEnvironmentNamesNoLink) {
    request.InitEnv(J(R"({"HTTP_X_FAKE_SHARING": "hash"})"));
    request.InitEnv(J(R"({"HTTP_X_FAKE_SHARING": ""})"));
    EXPECT_FALSE(request.IsSharing());
    EXPECT_EQ(request.GetSharingEntry().get_project_name(), "files");
}

TEST_F(SharingContext, TakesAHeaderThatIsNoTextForWhatItsTextIs) {
    request.InitEnv(J(R"({"HTTP_X_FAKE_SHARING": {}})"));
    EXPECT_FALSE(request.IsSharing());
    request.InitEnv(J(R"({"HTTP_X_FAKE_SHARING": []})"));
    EXPECT_FALSE(request.IsSharing());
}

// ---- the URL ----

class SharingURL : public SharingContext {
protected:
    SharingURL() { platform.sharingURL = "https://nas/sharing/"; }

    Texts Computed() const { return platform.CallsOf({"GetSharingURL"}); }
};

TEST_F(SharingURL, IsWorkedOutFromTheRequestsOwn) {
    request.InitEnv(J(R"({"HTTP_HOST": "nas:8443", "HTTPS": "on", "REQUEST_URI": "/webapi/entry.cgi?api=x",
                          "REWRITE_APP": "photo"})"));
    EXPECT_EQ(request.GetSharingURL("x"), "https://nas/sharing/");
    EXPECT_EQ(Computed(), (Texts{"GetSharingURL(nas, 8443, https, /webapi/, photo)"}));
    EXPECT_EQ(request.GetSharingURLType(), ZOVA::sharing::SHARING_URL_HOST);
}

TEST_F(SharingURL, OfABareRequestIsAskedForWithDefaults) {
    request.GetSharingURL("");
    EXPECT_EQ(Computed(), (Texts{"GetSharingURL(, 0, http, , )"}));
}

TEST_F(SharingURL, DoesNotTakeTheRewritePrefixWhereHostIsSet) {
    request.InitEnv(J(R"({"HTTP_HOST": "nas", "HOST": "nas.example", "REWRITE_APP": "photo"})"));
    request.GetSharingURLType();
    EXPECT_EQ(Computed(), (Texts{"GetSharingURL(nas, 80, http, , )"}));
}

TEST_F(SharingURL, IsWorkedOutOnceAndALaterFallbackIsIgnored) {
    EXPECT_EQ(request.GetSharingURL("a"), "https://nas/sharing/");
    platform.sharingURL = "https://other/";
    EXPECT_EQ(request.GetSharingURL("b"), "https://nas/sharing/");
    EXPECT_EQ(platform.CountOf("GetSharingURL"), 1);
}

TEST_F(SharingURL, ThatThePlatformLeftEmptyIsStoredEmpty) {
    platform.sharingURL = "";
    EXPECT_EQ(request.GetSharingURL("x"), "");
    EXPECT_EQ(request.GetSharingURL("x"), "");
    EXPECT_EQ(platform.CountOf("GetSharingURL"), 1);
    EXPECT_EQ(request.GetSharingURLType(), 0);
}

TEST_F(SharingURL, TravelsWithTheRequestButItsTypeDoesNot) {
    request.GetSharingURL("");
    Json::Value travelled = request.Serialize();
    APIRequest received{Json::Value()};
    received.Deserialize(travelled);
    EXPECT_EQ(received.GetSharingURL("x"), "https://nas/sharing/");
    EXPECT_EQ(received.GetSharingURLType(), 0);
    const APIRequest copy(request);
    EXPECT_EQ(APIRequest(copy).GetSharingURLType(), ZOVA::sharing::SHARING_URL_HOST);
}

}  // namespace
