#include "webapi/TypedValue.h"

#include "common/JsonText.h"

namespace reference {

namespace {

/** Most digits that surely fit into 64 bits with a sign. */
constexpr size_t kSafeDigits = 18;

/** The plain spelling of a small integer: by far the most frequent typed value. */
bool ParseSmallInteger(std::string_view text, Json::Value& out) {
    const bool negative = !text.empty() && text.front() == '-';
    const std::string_view digits = text.substr(negative ? 1 : 0);
    if (digits.empty() || digits.size() > kSafeDigits || (digits.front() == '0' && digits.size() > 1)) {
        return false;
    }
    Json::Int64 number = 0;
    for (char digit : digits) {
        if (digit < '0' || digit > '9') {
            return false;
        }
        number = number * 10 + (digit - '0');
    }
    out = Json::Value(negative ? -number : number);
    return true;
}

/** Whether the outer bytes are those of a JSON value, which most texts already fail. */
bool MayBeJson(std::string_view text) {
    if (text.empty()) {
        return false;
    }
    switch (text.front()) {
        case '{':
            return text.back() == '}';
        case '[':
            return text.back() == ']';
        case '"':
            return text.back() == '"' && text.size() > 1;
        case 't':
        case 'f':
            return text == "true" || text == "false";
        case 'n':
            return text == "null";
        default:
            return (text.front() == '-' || (text.front() >= '0' && text.front() <= '9')) && text.back() >= '0' &&
                   text.back() <= '9';
    }
}

}  // namespace

Json::Value TypedValue(std::string_view text) {
    Json::Value value;
    if (ParseSmallInteger(text, value) || (MayBeJson(text) && ParseJson(text, value))) {
        return value;
    }
    return Json::Value(text.data(), text.data() + text.size());
}

}  // namespace reference
