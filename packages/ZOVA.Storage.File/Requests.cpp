#include "Requests.h"

#include <utility>

#include "../common/Parameters.h"
#include "ClientPath.h"
#include "EntryJson.h"

namespace package {
namespace {

constexpr char kPaths[] = "paths";
constexpr char kResults[] = "results";

}  // namespace

bool ReadPath(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, const char* parameter, std::string& out) {
    const auto given = request->GetAndCheckString(parameter, ZOVA::APIRequest::PARAM_REQUIRED);
    if (given.IsInvalid() || given.IsReset()) {
        RefuseParameter(response, parameter);
        return false;
    }
    if (!IsClientPath(given.Get())) {
        Refuse(response, FILE_ERR_BAD_PATH);
        return false;
    }
    out = given.Get();
    return true;
}

bool ReadPaths(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, std::vector<std::string>& out) {
    const auto given = request->GetAndCheckUnitArray(kPaths, ZOVA::APIRequest::PARAM_REQUIRED);
    const Json::Value& paths = given.Get();
    bool isGood = !given.IsInvalid() && !given.IsReset() && !paths.empty() && paths.size() <= kMostPaths;
    for (Json::ArrayIndex at = 0; isGood && at < paths.size(); ++at) {
        isGood = paths[at].isString();
        if (isGood) {
            out.push_back(paths[at].asString());
        }
    }
    if (!isGood) {
        RefuseParameter(response, kPaths);
    }
    return isGood;
}

bool ReadFlag(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, const char* parameter, bool& out) {
    const auto given = request->GetAndCheckBool(parameter, ZOVA::APIRequest::PARAM_OPTIONAL);
    if (given.IsInvalid() || given.IsReset()) {
        RefuseParameter(response, parameter);
        return false;
    }
    out = given.Get(out);
    return true;
}

bool ReadWord(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, const char* parameter,
              const char* const* words, int& out) {
    const auto given = request->GetAndCheckString(parameter, ZOVA::APIRequest::PARAM_OPTIONAL);
    if (!given.IsSet()) {
        return true;
    }
    for (int at = 0; !given.IsInvalid() && !given.IsReset() && words[at] != nullptr; ++at) {
        if (given.Get() == words[at]) {
            out = at;
            return true;
        }
    }
    RefuseParameter(response, parameter);
    return false;
}

void Results::Add(const std::string& path, FileError error, Json::Value known) {
    AddText(known, "path", path);
    if (error != FILE_OK) {
        known["error"] = static_cast<int>(error);
        firstError = firstError == FILE_OK ? error : firstError;
    }
    rows.append(std::move(known));
}

void Results::Answer(ZOVA::APIResponse* response) const {
    Json::Value data(Json::objectValue);
    data[kResults] = rows;
    if (firstError == FILE_OK) {
        response->SetSuccess(data);
    } else {
        response->SetError(firstError, data);
    }
}

}  // namespace package
