// The measured package: one small method, behind an API that is open and one that asks for a login.

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>

namespace {

constexpr int kNameMissing = 400;

void Hello(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    const auto name = request->GetAndCheckString("name", ZOVA::APIRequest::PARAM_REQUIRED);
    if (name.IsInvalid()) {
        response->SetError(kNameMissing, Json::Value());
        return;
    }
    Json::Value data(Json::objectValue);
    data["greeting"] = "Hello, " + name.Get();
    response->SetSuccess(data);
}

const ZOVA::_tag_API_TABLE kTable[] = {
    {"ZOVA.Bench.Small", 1, "hello", Hello},
    {"ZOVA.Bench.Login", 1, "hello", Hello},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
