#include "JsonRoundTrip.h"

#include <algorithm>

#include "Check.h"
#include "webapi/Json.h"

namespace fuzz {

int Depth(const Json::Value& value) {
    int deepest = 0;
    if (value.type() != Json::arrayValue && value.type() != Json::objectValue) {
        return deepest;
    }
    for (const Json::Value& element : value) {
        deepest = std::max(deepest, Depth(element));
    }
    return deepest + 1;
}

void CheckRoundTrip(const Json::Value& value) {
    const std::string text = Json::toString(value);
    Json::Value again;
    const bool read = Json::fromString(again, text);
    FUZZ_CHECK(read == (Depth(value) <= Json::kMaximumDepth));
    FUZZ_CHECK(!read || Json::toString(again) == text);
}

}  // namespace fuzz
