// The form of a relayed call: whatever parameters a client sent, the peer's intake finds them again, and no credential.

#include <vector>

#include "Check.h"
#include "Target.h"
#include "webapi/Json.h"
#include "webapiutil.h"
#include "zovacgi.h"
#include "zovacredential/RelayForm.h"

namespace {

const reference::RelayCall kCall{"ZOVA.Core.User", 1, "get"};
const std::string kToken(64, 'a');

constexpr const char* kStaysHere[] = {"_sid",          "tid",          "_oat",         "_sharing_id",   "_sharing_sid",
                                      "__nEkOtReHpIc", "__tXeTrEhPiC", "__cIpHeRtExT", "__cIpHeRtOkEn", "relay_zn",
                                      "relay_timeout", "api",          "version",      "method"};

/** Whether an envelope stands in the object, or in one of its name inside it. */
bool HoldsEnvelope(const Json::Value& holder) {
    for (const Json::Value* level = &holder; level->type() == Json::objectValue;
         level = &Json::member(*level, "webapi")) {
        if (Json::hasMember(*level, "__cIpHeRtExT")) {
            return true;
        }
    }
    return false;
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Json::Value params;
    FUZZ_CHECK(ZOVA::WebAPIUtil::strPairToJsonObj(fuzz::TextOf(data, size), params, true, true));
    const std::string form = reference::CallForm(kCall, kToken, params);

    std::vector<char> line(form.begin(), form.end());
    line.push_back('\0');
    FUZZ_CHECK(ZovaCgiDetectAndDecryptParamLine(line.data()) == line.data() && form == line.data());

    Json::Value arrived;
    FUZZ_CHECK(ZOVA::WebAPIUtil::strPairToJsonObj(form, arrived, true, true));
    FUZZ_CHECK(arrived["tid"] == kToken && arrived["api"] == kCall.api && arrived["version"] == kCall.version &&
               arrived["method"] == kCall.method);
    arrived.removeMember("tid");
    for (const char* name : {"api", "version", "method"}) {
        arrived.removeMember(name);
    }
    for (const char* name : kStaysHere) {
        FUZZ_CHECK(!Json::hasMember(arrived, name));
        params.removeMember(name);
    }
    FUZZ_CHECK(!HoldsEnvelope(Json::member(arrived, "webapi")));
    if (HoldsEnvelope(Json::member(params, "webapi")) ||
        Json::toString(params).find("__cIpHeRtOkEn") != std::string::npos) {
        params.removeMember("webapi");
        arrived.removeMember("webapi");
    }
    FUZZ_CHECK(Json::toString(arrived) == Json::toString(params));
    return 0;
}
