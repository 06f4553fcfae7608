#include "LoginParameters.h"

#include <webapi/Json.h>

#include <cstddef>
#include <utility>

#include "../common/Text.h"

namespace package {
namespace {

constexpr char kAccount[] = "account";
constexpr char kPassword[] = "passwd";
constexpr char kCsrf[] = "csrf";
constexpr char kEnvelope[] = "webapi";

constexpr std::size_t kLongestAccount = 255;
constexpr std::size_t kLongestPassword = 511;

/** A reference into the request, or to a null value. */
const Json::Value& Find(const ZOVA::APIRequest* request, const char* name) {
    if (request->HasParam(name)) {
        return request->GetParamRef(name, Json::Value::nullSingleton());
    }
    return Json::member(request->GetParamRef(kEnvelope, Json::Value::nullSingleton()), name);
}

/** Takes the text of a value; false if it is no text, no whole number, empty, too long or holds control bytes. */
bool TakeText(const Json::Value& value, std::size_t longest, Secret& out) {
    const Json::ValueType type = value.type();
    if (type != Json::stringValue && type != Json::intValue && type != Json::uintValue) {
        return false;
    }
    out.Take(Json::asString(value));
    return !out.Empty() && out.Text().size() <= longest && !HasControlBytes(out.Text());
}

}  // namespace

const char* ReadLoginParameters(const ZOVA::APIRequest* request, LoginParameters& out) {
    Secret account;
    if (!TakeText(Find(request, kAccount), kLongestAccount, account)) {
        return kAccount;
    }
    if (!TakeText(Find(request, kPassword), kLongestPassword, out.password)) {
        return kPassword;
    }
    const Json::Value& csrf = Find(request, kCsrf);
    if (!csrf.isNull() && !csrf.isBool()) {
        return kCsrf;
    }
    out.account = account.Text();
    out.csrf = csrf.isBool() && csrf.asBool();
    return nullptr;
}

}  // namespace package
