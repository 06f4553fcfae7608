#include <glob.h>

#include <cerrno>
#include <string_view>

#include "base/Log.h"
#include "base/Printable.h"
#include "webapi/APIRequest.h"
#include "webapi/APIRunner.h"
#include "webapi/Json.h"
#include "webapiutil.h"
#include "zovacore.h"

namespace ZOVA {

namespace {

constexpr int kMaximumPriority = 10;
constexpr int kMaximumPrefixes = 4;

bool IsNameByte(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '_' || c == '-';
}

/**
 * Whether the name may become a file name: letters, digits, "_", "-" and single dots between them. No such name leads
 * out of the working directory.
 */
bool IsAPIName(std::string_view api) {
    char previous = '.';
    for (char c : api) {
        if (c == '.' ? previous == '.' : !IsNameByte(c)) {
            return false;
        }
        previous = c;
    }
    return previous != '.';
}

/**
 * The file with the longest existing prefix of at least two name components, of which at most four are tried; empty if
 * there is none. The search leaves `errno` at 0, so that it does not colour later log lines.
 */
std::string FindDescriptionFile(const std::string& api) {
    std::string found;
    std::size_t position = api.find('.');
    for (int attempt = 0; attempt < kMaximumPrefixes; ++attempt) {
        if (position != std::string::npos) {
            position = api.find('.', position + 1);
        }
        const std::string candidate = api.substr(0, position) + ".lib";
        if (QLIBCFileExist(candidate.c_str()) == 1) {
            found = candidate;
        }
        if (position == std::string::npos) {
            break;
        }
    }
    errno = 0;
    return found;
}

/** Takes the usable descriptions of one file over into `out`; logs those that are not. */
void TakeDescriptions(APIRunner& runner, Json::Value& file, Json::Value& out) {
    if (file.type() != Json::objectValue) {
        return;
    }
    for (auto description = file.begin(); description != file.end(); ++description) {
        if (runner.CheckLibDescription(*description)) {
            out[description.name()].swap(runner.ApplyLibDef(*description));
        } else {
            WEBAPI_LOG(LOG_ERR, "WebAPI description %s is not valid.", base::Printable(description.name()).c_str());
        }
    }
}

}  // namespace

bool APIRunner::CheckLibDescription(Json::Value& description) {
    const Json::Value& lib = Json::member(description, "lib");
    if (!lib.isString() || Json::asString(lib).empty()) {
        return false;
    }
    if (!Json::member(description, "minVersion").isInt() || !Json::member(description, "maxVersion").isInt() ||
        Json::member(description, "methods").type() != Json::objectValue) {
        return false;
    }
    if (!Json::hasMember(description, "priority")) {
        return true;
    }
    const Json::Value& priority = description["priority"];
    return priority.isInt() && priority.asInt() <= kMaximumPriority && priority.asInt() >= -kMaximumPriority;
}

Json::Value& APIRunner::ApplyLibDef(Json::Value& description) {
    if (!Json::isObject(description)) {
        return description;
    }
    for (const char* key : {"authLevel", "allowUser", "requestFormat", "priority"}) {
        if (!Json::hasMember(description, key)) {
            const bool isFormat = std::string_view(key) == "requestFormat";
            description[key] = isFormat ? Json::Value("JSON") : Json::member(libDefault, key);
        }
    }
    return description;
}

bool APIRunner::InitLibDesc(Json::Value& out, const std::string& api) {
    if (api.empty() || !Json::isObject(out)) {
        return false;
    }
    // A file may describe an API under a name that is none, beside others.
    const bool isName = IsAPIName(api);
    if (isName && Json::hasMember(out, api)) {
        return true;
    }
    const std::string file = isName ? FindDescriptionFile(api) : "";
    if (file.empty()) {
        WEBAPI_LOG(LOG_ERR, "WebAPI %s is not valid", base::Printable(api).c_str());
        return false;
    }
    Json::Value descriptions;
    if (!WebAPIUtil::ReadJsonFile(descriptions, file.c_str())) {
        WEBAPI_LOG(LOG_ERR, "WebAPI description file %s is not valid", file.c_str());
        return false;
    }
    TakeDescriptions(*this, descriptions, out);
    return true;
}

bool APIRunner::InitLibDesc(Json::Value& out, APIRequest* call) {
    return call != nullptr && InitLibDesc(out, call->GetAPIClass());
}

bool APIRunner::InitLibDesc(Json::Value& out) {
    glob_t files{};
    if (!Json::isObject(out) || glob("*.lib", 0, nullptr, &files) != 0) {
        globfree(&files);
        return false;
    }
    for (std::size_t i = 0; i < files.gl_pathc; ++i) {
        Json::Value descriptions;
        if (WebAPIUtil::ReadJsonFile(descriptions, files.gl_pathv[i])) {
            TakeDescriptions(*this, descriptions, out);
        }
    }
    globfree(&files);
    return true;
}

const Json::Value& APIRunner::GetMethod(const std::string& api, int version, const std::string& method) {
    const Json::Value& defaults = Json::member(libDefault, "methods");
    if (!InitLibDesc(libDesc, api)) {
        return defaults;
    }
    const Json::Value& versions = Json::member(Json::member(libDesc, api), "methods");
    const Json::Value& entries = Json::member(versions, std::to_string(version));
    if (entries.type() != Json::arrayValue) {
        return defaults;
    }
    for (const Json::Value& entry : entries) {
        // Only the first member names a method here, although admission finds one at any place.
        if (entry.type() == Json::objectValue && !entry.empty() && entry.begin().name() == method) {
            return *entry.begin();
        }
    }
    return defaults;
}

bool APIRunner::GetMethodAttr(const std::string& api, int version, const std::string& method, const std::string& attr) {
    const Json::Value& attributes = GetMethod(api, version, method);
    if (Json::isObject(attributes)) {
        return Json::asBool(Json::member(attributes, attr));
    }
    return Json::asBool(Json::member(Json::member(libDefault, "methods"), attr));
}

bool APIRunner::GetMethodAttr(APIRequest* call, const std::string& attr) {
    if (call == nullptr || attr.empty()) {
        return false;
    }
    return GetMethodAttr(call->GetAPIClass(), call->GetAPIVersion(), call->GetAPIMethod(), attr);
}

}  // namespace ZOVA
