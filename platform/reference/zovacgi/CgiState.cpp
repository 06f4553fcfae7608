#include "zovacgi/CgiState.h"

#include "Seam.h"

namespace reference {

CgiState& CgiState::Of(ZovaCgi& cgi) {
    if (cgi.state == nullptr) {
        cgi.state = new CgiState;
    }
    return *static_cast<CgiState*>(cgi.state);
}

SessionStore::Result CgiState::Find(std::string_view sid) {
    if (!foundSid.empty() && foundSid == sid) {
        return SessionStore::Result::kGood;
    }
    foundSid.clear();
    const SessionStore::Result result = SessionStore::Load(sid, entry);
    if (result == SessionStore::Result::kGood) {
        foundSid = sid;
    }
    return result;
}

}  // namespace reference
