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

}  // namespace ZOVA
