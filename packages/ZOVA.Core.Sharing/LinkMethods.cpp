#include "LinkMethods.h"

#include <webapi/Json.h>

#include <string>

#include "../common/Fence.h"
#include "../common/Parameters.h"
#include "../common/PlatformSharing.h"
#include "../common/Text.h"
#include "LinkErrors.h"

namespace package {
namespace {

constexpr char kHash[] = "hash";
constexpr char kProject[] = "project";
constexpr char kPassword[] = "password";
constexpr const char* kFields[] = {"paths",    "protect_type", kPassword,     "users",  "addresses",
                                   "match_ip", "expires",      "visit_limit", "enabled"};

/** The parameters that are fields of a link. A password of digits arrives as a number and means the text. */
Json::Value FieldsOf(const ZOVA::APIRequest* request) {
    Json::Value fields(Json::objectValue);
    for (const char* name : kFields) {
        if (request->HasParam(name)) {
            fields[name] = request->GetParam(name, Json::Value());
        }
    }
    if (fields.isMember(kPassword) && fields[kPassword].isIntegral()) {
        fields[kPassword] = Json::asString(fields[kPassword]);
    }
    return fields;
}

bool ReadHash(ZOVA::APIRequest* request, ZOVA::APIResponse* response, std::string& hash) {
    const auto given = request->GetAndCheckString(kHash, ZOVA::APIRequest::PARAM_REQUIRED);
    if (given.IsInvalid() || given.IsReset() || !given.IsSet() || HasControlBytes(given.Get())) {
        RefuseParameter(response, kHash);
        return false;
    }
    hash = given.Get();
    return true;
}

/** Texts that came from elsewhere, as paths do, must not break the answer. */
Json::Value Shown(ZOVA::APIRequest* request, Json::Value link) {
    for (Json::Value& path : link["paths"]) {
        path = ValidUtf8(path.asString());
    }
    const std::string url = request->GetSharingURL("");
    link["url"] = url.empty() ? "" : url + link[kHash].asString();
    return link;
}

/** A null answer is a success without data. */
void Answer(ZOVA::APIResponse* response, int result, const Json::Value& data) {
    if (result == ZOVA_LINK_OK) {
        response->SetSuccess(data);
    } else {
        RefuseLink(response, result);
    }
}

void Create(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Json::Value fields = FieldsOf(request);
    fields[kProject] = request->GetParam(kProject, Json::Value());
    Json::Value made;
    const int result = ZovaLinkCreate(request->GetLoginUserName().c_str(), &fields, &made);
    Answer(response, result, result == ZOVA_LINK_OK ? Shown(request, made) : Json::Value());
}

void Get(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    std::string hash;
    if (!ReadHash(request, response, hash)) {
        return;
    }
    Json::Value link;
    const int result = ZovaLinkGet(request->GetLoginUserName().c_str(), hash.c_str(), &link);
    Answer(response, result, result == ZOVA_LINK_OK ? Shown(request, link) : Json::Value());
}

void List(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Json::Value links;
    const int result = ZovaLinkList(request->GetLoginUserName().c_str(), &links);
    Json::Value data(Json::objectValue);
    data["links"] = Json::Value(Json::arrayValue);
    for (const Json::Value& link : links) {
        data["links"].append(Shown(request, link));
    }
    Answer(response, result, data);
}

void Update(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    std::string hash;
    if (!ReadHash(request, response, hash)) {
        return;
    }
    if (request->HasParam(kProject)) {
        RefuseParameter(response, kProject);
        return;
    }
    const Json::Value fields = FieldsOf(request);
    Answer(response, ZovaLinkUpdate(request->GetLoginUserName().c_str(), hash.c_str(), &fields), Json::Value());
}

void Delete(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    std::string hash;
    if (ReadHash(request, response, hash)) {
        Answer(response, ZovaLinkDelete(request->GetLoginUserName().c_str(), hash.c_str()), Json::Value());
    }
}

}  // namespace

void CreateLink(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("create", response, [&] { Create(request, response); });
}

void GetLink(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("get", response, [&] { Get(request, response); });
}

void ListLinks(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("list", response, [&] { List(request, response); });
}

void UpdateLink(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("update", response, [&] { Update(request, response); });
}

void DeleteLink(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("delete", response, [&] { Delete(request, response); });
}

}  // namespace package
