// A library whose check table is null.

#include "webapi/APIResponse.h"
#include "webapi/APITable.h"

namespace {

void Succeed(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    response->SetSuccess("ran");
}

const ZOVA::_tag_API_TABLE table[] = {
    {"ZOVA.Test.NullCheck", 1, "success", Succeed},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return table;
}

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_CHECK_TABLE* GetAPICheckTable() {
    return nullptr;
}
