// The content of a session file.

#include <string_view>

#include "Check.h"
#include "Target.h"
#include "common/ControlBytes.h"
#include "common/DeviceInformation.h"
#include "zovacgi/Session.h"
#include "zovacgi/SessionCheck.h"
#include "zovacgi/SessionId.h"

namespace {

constexpr const char* kUntouched = "as before";

void CheckGood(const reference::Session& session) {
    FUZZ_CHECK(!session.user.empty() && session.user.size() <= reference::kLongestUserName);
    for (const std::string* text : {&session.user, &session.address, &session.app, &session.webapi}) {
        FUZZ_CHECK(!reference::HasControlByte(*text));
    }
    FUZZ_CHECK(session.token.empty() || reference::IsSessionId(session.token));
    FUZZ_CHECK(session.created >= 0);
    FUZZ_CHECK(session.uid != static_cast<uid_t>(-1));
    FUZZ_CHECK(session.timeout >= 0 && session.timeout <= reference::kLongestIdleMinutes);

    const std::string text = reference::WriteSession(session);
    reference::Session again;
    FUZZ_CHECK(reference::ParseSession(text, again));
    FUZZ_CHECK(reference::WriteSession(again) == text);
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    reference::Session session;
    session.user = kUntouched;
    session.timeout = -1;
    if (reference::ParseSession(fuzz::TextOf(data, size), session)) {
        CheckGood(session);
    } else {
        FUZZ_CHECK(session.user == kUntouched && session.timeout == -1);
    }
    return 0;
}
