#include "FakeLinks.h"

#include <webapi/Json.h>

#include <cstring>

#include "../../packages/common/PlatformSharing.h"

namespace {

Json::Value Described(const char* hash) {
    Json::Value link(Json::objectValue);
    link["hash"] = hash;
    link["paths"].append("/a");
    link["paths"].append("/\xff");
    return link;
}

int Note(const std::string& call) {
    FakeLinks::Instance().calls.push_back(call);
    return FakeLinks::Instance().result;
}

}  // namespace

FakeLinks& FakeLinks::Instance() {
    static FakeLinks fake;
    return fake;
}

FakeLinks& FakeLinks::Renew() {
    return Instance() = FakeLinks();
}

int ZovaLinkCreate(const char* owner, const Json::Value* fields, Json::Value* made) {
    const int result = Note(std::string("create ") + owner + " " + Json::toString(*fields));
    if (result == ZOVA_LINK_OK) {
        *made = Described("h1");
    }
    return result;
}

int ZovaLinkGet(const char* owner, const char* hash, Json::Value* link) {
    const int result = Note(std::string("get ") + owner + " " + hash);
    if (result == ZOVA_LINK_OK) {
        *link = Described(hash);
    }
    return result;
}

int ZovaLinkList(const char* owner, Json::Value* links) {
    const int result = Note(std::string("list ") + owner);
    if (result == ZOVA_LINK_OK) {
        links->append(Described("h1"));
    }
    return result;
}

int ZovaLinkUpdate(const char* owner, const char* hash, const Json::Value* fields) {
    return Note(std::string("update ") + owner + " " + hash + " " + Json::toString(*fields));
}

int ZovaLinkDelete(const char* owner, const char* hash) {
    return Note(std::string("delete ") + owner + " " + hash);
}

int ZovaLinkOpen(const char* hash, const ZovaLinkVisit* visit, char* sid, int sidSize, long long* expires) {
    const int result = Note(std::string("open ") + hash + " [" + visit->user + "] [" + visit->password + "] from " +
                            visit->address + (sidSize >= 65 ? "" : " without room"));
    if (result == ZOVA_LINK_OK) {
        strcpy(sid, FakeLinks::Instance().sid.c_str());
        *expires = 1000;
    }
    return result;
}
