#include <optional>

#include "base/Fence.h"
#include "base/Log.h"
#include "base/Printable.h"
#include "dispatcher/DirectoryScope.h"
#include "dispatcher/HatScope.h"
#include "dispatcher/IdentityPlan.h"
#include "dispatcher/IdentityScope.h"
#include "dispatcher/MethodAttributes.h"
#include "dispatcher/NiceScope.h"
#include "dispatcher/PermissionFrame.h"
#include "dispatcher/StreamScope.h"
#include "dispatcher/UploadFrame.h"
#include "envelope/APIRequestPrivate.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/Json.h"

namespace ZOVA {

namespace {

constexpr const char* kCountAttribute = "_collector_count_webapi";

void Answer(APIResponse& response, int code) {
    response.SetError(code, Json::Value());
}

/** The first row for the call, or the row that ends the table. */
template <class Row>
const Row& FindRow(const Row* table, const CallName& call) {
    for (; table->api != nullptr; ++table) {
        if (table->version == call.version && call.api == table->api && table->method != nullptr &&
            call.method == table->method) {
            break;
        }
    }
    return *table;
}

/**
 * Calls into foreign code: no exception leaves it.
 * @return false if one was caught; it is logged then.
 */
template <class Function>
bool Fenced(const CallName& call, const char* kind, const Function& function) {
    const std::optional<std::string> thrown = base::ThrownBy(function);
    if (thrown) {
        WEBAPI_LOG(LOG_ERR, "%s of %s version %d method %s threw: %s", kind, base::Printable(call.api).c_str(),
                   call.version, base::Printable(call.method).c_str(), thrown->c_str());
    }
    return !thrown;
}

/** True lets the call go on. A check that throws refuses it with 117. */
bool PassesCheck(const _tag_API_CHECK_TABLE* checkTable, const CallName& call, APIRequest* request,
                 APIResponse* response) {
    const APICheckFunc check = checkTable == nullptr ? nullptr : FindRow(checkTable, call).check;
    if (check == nullptr) {
        return true;
    }
    bool passed = false;
    if (!Fenced(call, "the check", [&] { passed = check(request, response); })) {
        Answer(*response, WEBAPI_ERR_INTERNAL);
        return false;
    }
    return passed;
}

bool TakeIdentity(const IdentityPlan& plan, IdentityScope& identity) {
    if (plan.grantByDefault) {
        if (!identity.BecomeEffectiveRoot()) {
            WEBAPI_LOG(LOG_ERR, "grantByDefault failed. [%m]");
            return false;
        }
        return true;
    }
    if (plan.grantByUser) {
        if (plan.login.empty()) {
            WEBAPI_LOG(LOG_ERR, "grantByUser: failed to get login username.");
            return false;
        }
        if (!ResetIdentity(plan.User(), plan.grantable)) {
            WEBAPI_LOG(LOG_ERR, "grantByUser failed. [%m]");
            return false;
        }
        return true;
    }
    if (!ResetIdentity(plan.User(), plan.grantable)) {
        WEBAPI_LOG(LOG_ERR, "grantable failed. [%m]");
        return false;
    }
    return true;
}

/** From the check table to the method and back to the old identity. True if the method was called. */
bool CallMethod(const CallName& name, const Json::Value& attributes, const _tag_API_TABLE* table,
                const _tag_API_CHECK_TABLE* checkTable, APIRequest* request, APIResponse* response,
                DirectoryScope& directory) {
    const bool passed = PassesCheck(checkTable, name, request, response);
    APIRequestPrivate::Of(*request).SetCallName(name);
    if (!passed) {
        return false;
    }
    const APIMethodFunc method = FindRow(table, name).function;
    if (method == nullptr) {
        Answer(*response, WEBAPI_ERR_METHOD_NOT_IN_TABLE);
        return false;
    }
    // Stands as the answer unless the method replaces it.
    Answer(*response, WEBAPI_ERR_INTERNAL);
    directory.Save();
    IdentityScope identity;
    if (!identity.Save()) {
        return false;
    }
    const IdentityPlan plan = IdentityPlan::Of(*request, attributes);
    if (!TakeIdentity(plan, identity)) {
        return false;
    }
    if (!Fenced(name, "the method", [&] { method(request, response); })) {
        Answer(*response, WEBAPI_ERR_INTERNAL);
    }
    if (plan.grantable) {
        identity.Restore();
    }
    return true;
}

}  // namespace

bool APIRunner::ProcessLib(APIRequest* call, APIResponse* answer) {
    // What runs is what was admitted: nothing that arrives later changes the names by which the stations choose.
    const CallName name{call->GetAPIClass(), call->GetAPIVersion(), call->GetAPIMethod()};
    if (!PassesGate(*this, call, answer)) {
        return false;
    }

    const Json::Value attributes = MethodAttributes(*this, name);
    const bool allowUpload = Json::asBool(Json::member(attributes, "allowUpload"));
    const bool allowDownload = Json::asBool(Json::member(attributes, "allowDownload"));
    if (Json::asBool(request->GetAttr(kCountAttribute, false)) &&
        !Json::asBool(Json::member(attributes, "allowTimeout")) && Json::asBool(call->GetAPIInfo("count", true))) {
        IncreaseCounter(call);
    }

    const HatScope hat(name.api, name.method);

    if (!TakesUpload(*this, name, attributes, call, answer)) {
        return false;
    }

    _tag_API_TABLE* table = nullptr;
    _tag_API_CHECK_TABLE* checkTable = nullptr;
    if (!OpenLib(call, &table, &checkTable) || table == nullptr) {
        Answer(*answer, WEBAPI_ERR_LIB_LOAD_FAILED);
        return false;
    }

    // The guards give back in a fixed order: nice value, stream objects, working directory, hat.
    DirectoryScope directory;
    StreamScope streams(allowUpload, allowDownload);
    const NiceScope nice(Json::asInt(call->GetAPIInfo("priority", 0)));
    const bool called = CallMethod(name, attributes, table, checkTable, call, answer, directory);
    streams.CloseFiles();
    return called;
}

}  // namespace ZOVA
