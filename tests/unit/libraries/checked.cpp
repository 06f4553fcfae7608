// A library with a check in front of each method.

#include <stdexcept>

#include "Marks.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APITable.h"
#include "webapi/Json.h"

using ZOVA::APIRequest;
using ZOVA::APIResponse;

namespace {

bool Pass(APIRequest*, APIResponse*) {
    UnitMark("check");
    return true;
}

bool RefuseWithError(APIRequest*, APIResponse* response) {
    response->SetError(777, Json::Value());
    return false;
}

bool RefuseSilently(APIRequest*, APIResponse*) {
    return false;
}

bool Throw(APIRequest*, APIResponse* response) {
    response->SetSuccess(Json::Value());
    throw std::runtime_error("a check that fails");
}

/** Names another call, as parameters that arrive late might. */
bool RenameCall(APIRequest* request, APIResponse*) {
    Json::Value params(Json::objectValue);
    params["postParam"]["api"] = "ZOVA.Test.Other";
    params["postParam"]["version"] = 9;
    params["postParam"]["method"] = "by_default";
    request->InitParam(params, false);
    return true;
}

bool NoteError(APIRequest*, APIResponse* response) {
    UnitMark(("check sees " + std::to_string(response->GetError())).c_str());
    return true;
}

void Method(APIRequest* request, APIResponse* response) {
    UnitMark(("method sees " + std::to_string(response->GetError())).c_str());
    Json::Value data(Json::objectValue);
    data["api"] = request->GetAPIClass();
    data["version"] = request->GetAPIVersion();
    data["method"] = request->GetAPIMethod();
    response->SetSuccess(data);
}

void Silent(APIRequest*, APIResponse* response) {
    UnitMark(("method sees " + std::to_string(response->GetError())).c_str());
}

const ZOVA::_tag_API_TABLE table[] = {
    {"ZOVA.Test.Checked", 1, "passes", Method},
    {"ZOVA.Test.Checked", 1, "refused_with_error", Method},
    {"ZOVA.Test.Checked", 1, "refused_silently", Method},
    {"ZOVA.Test.Checked", 1, "throws", Method},
    {"ZOVA.Test.Checked", 1, "renames", Method},
    {"ZOVA.Test.Checked", 1, "notes_error", Method},
    {"ZOVA.Test.Checked", 1, "notes_error_silently", Silent},
    {"ZOVA.Test.Checked", 1, "null_check", Method},
    {"ZOVA.Test.Checked", 1, "no_row", Method},
    {nullptr, 0, nullptr, nullptr},
};

const ZOVA::_tag_API_CHECK_TABLE checks[] = {
    {"ZOVA.Test.Checked", 1, "passes", Pass, nullptr, nullptr},
    {"ZOVA.Test.Checked", 1, "passes", RefuseSilently, nullptr, nullptr},
    {"ZOVA.Test.Checked", 1, "refused_with_error", RefuseWithError, nullptr, nullptr},
    {"ZOVA.Test.Checked", 1, "refused_silently", RefuseSilently, nullptr, nullptr},
    {"ZOVA.Test.Checked", 1, "throws", Throw, nullptr, nullptr},
    {"ZOVA.Test.Checked", 1, "renames", RenameCall, nullptr, nullptr},
    {"ZOVA.Test.Checked", 1, "notes_error", NoteError, nullptr, nullptr},
    {"ZOVA.Test.Checked", 1, "notes_error_silently", NoteError, nullptr, nullptr},
    {"ZOVA.Test.Checked", 1, "null_check", nullptr, nullptr, nullptr},
    {nullptr, 0, nullptr, nullptr, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return table;
}

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_CHECK_TABLE* GetAPICheckTable() {
    return checks;
}
