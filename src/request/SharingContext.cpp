#include "envelope/APIRequestPrivate.h"
#include "webapi/Json.h"

namespace ZOVA {

void APIRequestPrivate::InitSharing() {
    sharingId = Json::asString(GetData("environ", SZ_X_SHARING_HEADER, ""));
    sharingSid = Json::asString(GetData("cookie", sharing::SZK_SHARING_SID, ""));
    if (sharingId.empty()) {
        return;
    }
    sharing::db::SharingDB& database = sharing::db::SharingDB::Instance();
    sharing::db::EntryDB entries(database);
    sharing::db::SessionDB sessions(database);
    sharing::db::TokenDB tokens(database);
    if (database.IsGood()) {
        // What a record holds after a failed look-up is for the sharing gate to judge.
        entries.GetByHash(sharingId, sharingEntry);
        sessions.GetBySessionId(sharingSid, sharingSession);
        tokens.GetBySessionEntry(sharingSession, sharingEntry, sharingToken);
    }
}

void APIRequestPrivate::InitSharingURL() {
    if (HasData("url", "urlSharing")) {
        return;
    }
    // Behind the device's own name no application prefix is looked at.
    const std::string host = Json::asString(GetData("environ", "HOST", ""));
    const std::string rewriteApp = host.empty() ? Json::asString(GetData("environ", "REWRITE_APP", "")) : "";
    const std::string path = owner->GetURLPath("");
    const bool https = owner->GetURLProto("http") == "https";
    const int port = owner->GetURLPort(0);
    std::string url;
    sharing::_tag_SHARING_URL_TYPE type = sharing::SHARING_URL_UNKNOWN;
    sharing::GetSharingURL(owner->GetURLHost(""), port, https, path, rewriteApp, url, type);
    SetData("url", "urlSharing", url, true);
    sharingUrlType = type;
}

std::string APIRequest::GetSharingURL(const std::string& fallback) {
    d->InitSharingURL();
    return Json::asString(d->GetData("url", "urlSharing", fallback));
}

sharing::_tag_SHARING_URL_TYPE APIRequest::GetSharingURLType() {
    d->InitSharingURL();
    return d->sharingUrlType;
}

}  // namespace ZOVA
