#include "ServerMethods.h"

#include "../common/Fence.h"
#include "../common/RecordList.h"
#include "ServerRecord.h"

namespace package {
namespace {

constexpr RecordList kServers = {"oauth-servers.json", "servers", 32, CheckServer};

}  // namespace

void GetServers(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    Fenced("get", response, [&] {
        Json::Value servers;
        if (ReadRecords(kServers, response, servers)) {
            response->SetSuccess(servers);
        }
    });
}

void SetServers(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("set", response, [&] { ReplaceRecords(kServers, request, response); });
}

}  // namespace package
