#include "Parameters.h"

namespace package {

void RefuseParameter(ZOVA::APIResponse* response, const char* parameter) {
    Json::Value errors(Json::objectValue);
    errors["parameter"] = parameter;
    response->SetError(ZOVA::WEBAPI_ERR_BAD_REQUEST, errors);
}

bool ReadInteger(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, const char* parameter, int lowest,
                 int highest, int& value) {
    const auto given = request->GetAndCheckInt(parameter, ZOVA::APIRequest::PARAM_OPTIONAL);
    if (given.IsInvalid() || given.IsReset() || (given.IsSet() && (given.Get() < lowest || given.Get() > highest))) {
        RefuseParameter(response, parameter);
        return false;
    }
    if (given.IsSet()) {
        value = given.Get();
    }
    return true;
}

}  // namespace package
