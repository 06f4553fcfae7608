#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>

namespace {

bool IsShort(const std::string& name) {
    return name.size() <= 64;
}

void Hello(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    auto name = request->GetAndCheckString("name", ZOVA::APIRequest::PARAM_OPTIONAL, IsShort);
    if (name.IsInvalid()) {
        response->SetError(ZOVA::WEBAPI_ERR_BAD_REQUEST, Json::Value());
        return;
    }
    name.SetDefault("world");
    Json::Value data(Json::objectValue);
    data["greeting"] = "Hello, " + name.Get();
    response->SetSuccess(data);
}

const ZOVA::_tag_API_TABLE kTable[] = {
    {"Example.Greeting", 1, "hello", Hello},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
