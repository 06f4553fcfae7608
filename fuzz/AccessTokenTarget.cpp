// The record of a device access token.

#include <string_view>

#include "Check.h"
#include "Target.h"
#include "common/ControlBytes.h"
#include "zovaaccesstoken/TokenRecord.h"
#include "zovacgi/Session.h"

namespace {

constexpr const char* kUntouched = "as before";

void CheckScopes(const reference::TokenRecord& record) {
    FUZZ_CHECK(!record.apis.empty() && record.apis.size() <= 64);
    for (const reference::TokenScope& scope : record.apis) {
        FUZZ_CHECK(!scope.api.empty() && scope.methods.size() <= 64);
        FUZZ_CHECK(scope.methods.empty() == record.Covers(scope.api, "no listed method, with its blanks") ||
                   record.apis.size() > 1);
        for (const std::string& method : scope.methods) {
            FUZZ_CHECK(record.Covers(scope.api, method));
        }
    }
    for (const char* api : {"", "*", "ZOVA.Core.Session", "ZOVA.Core.Token", "ZOVA.Entry.Request"}) {
        FUZZ_CHECK(!record.Covers(api, "create"));
    }
}

void CheckGood(const reference::TokenRecord& record) {
    FUZZ_CHECK(reference::IsTokenId(record.id));
    FUZZ_CHECK(!record.user.empty() && record.user.size() <= reference::kLongestUserName &&
               !reference::HasControlByte(record.user));
    FUZZ_CHECK(record.label.size() <= reference::kLongestTokenLabel && !reference::HasControlByte(record.label));
    FUZZ_CHECK(record.uid != static_cast<uid_t>(-1));
    FUZZ_CHECK(record.created >= 0 && record.expires - record.created <= reference::kLongestTokenTime);
    FUZZ_CHECK(!record.IsInForce(record.expires));
    CheckScopes(record);

    const std::string text = reference::WriteTokenRecord(record);
    reference::TokenRecord again;
    // Rewritten, a text whose bytes have to be escaped may be too long to be read.
    if (text.size() <= reference::kLargestTokenRecord) {
        FUZZ_CHECK(reference::ParseTokenRecord(text, again));
        FUZZ_CHECK(reference::WriteTokenRecord(again) == text);
    }
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    reference::TokenRecord record;
    record.user = kUntouched;
    if (reference::ParseTokenRecord(fuzz::TextOf(data, size), record)) {
        CheckGood(record);
    } else {
        FUZZ_CHECK(record.user == kUntouched);
    }
    return 0;
}
