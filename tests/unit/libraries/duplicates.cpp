// A table with several rows of one key, and rows of several APIs and versions.

#include "webapi/APIResponse.h"
#include "webapi/APITable.h"

namespace {

void First(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    response->SetSuccess("first");
}
void Second(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    response->SetSuccess("second");
}
void OtherVersion(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    response->SetSuccess("version 2");
}
void OtherAPI(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    response->SetSuccess("other");
}

const ZOVA::_tag_API_TABLE table[] = {
    {"ZOVA.Test.Twin", 1, "get", OtherAPI}, {"ZOVA.Test.Twice", 2, "get", OtherVersion},
    {"ZOVA.Test.Twice", 1, "get", First},   {"ZOVA.Test.Twice", 1, "get", Second},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return table;
}
