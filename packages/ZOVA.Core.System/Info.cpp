#include "Info.h"

#include <errno.h>
#include <string.h>
#include <syslog.h>

#include <chrono>
#include <cstddef>
#include <string>
#include <vector>

#include "../common/Fence.h"
#include "../common/Text.h"
#include "Figures.h"
#include "Mounts.h"
#include "SystemFile.h"
#include "VolumeProbe.h"

namespace package {
namespace {

constexpr std::chrono::milliseconds kPatience(1000);

Json::Value Volumes(const std::string& mountTable) {
    const std::vector<Mount> mounts = RealMounts(mountTable);
    std::vector<std::string> mountPoints;
    for (const Mount& mount : mounts) {
        mountPoints.push_back(mount.mountPoint);
    }
    const auto sizes = ProbeVolumes(mountPoints, kPatience);
    Json::Value volumes(Json::arrayValue);
    for (std::size_t at = 0; at < mounts.size(); ++at) {
        if (!sizes[at]) {
            continue;
        }
        Json::Value volume(Json::objectValue);
        volume["mount_point"] = ValidUtf8(mounts[at].mountPoint);
        volume["device"] = ValidUtf8(mounts[at].device);
        volume["type"] = mounts[at].type;
        volume["total"] = Json::UInt64(sizes[at]->total);
        volume["free"] = Json::UInt64(sizes[at]->free);
        volume["available"] = Json::UInt64(sizes[at]->available);
        volumes.append(volume);
    }
    return volumes;
}

Json::Value Describe(const LoadAverage& load) {
    Json::Value value(Json::objectValue);
    value["1"] = load.one;
    value["5"] = load.five;
    value["15"] = load.fifteen;
    return value;
}

Json::Value Describe(const Memory& memory) {
    Json::Value value(Json::objectValue);
    value["total"] = Json::UInt64(memory.total);
    value["free"] = Json::UInt64(memory.free);
    value["available"] = Json::UInt64(memory.available);
    return value;
}

void Answer(ZOVA::APIResponse* response) {
    std::string hostName;
    std::uint64_t uptime = 0;
    LoadAverage load;
    Memory memory;
    std::string mountTable;
    if (!ReadHostName(hostName) || !ReadUptime(uptime) || !ReadLoad(load) || !ReadMemory(memory) ||
        !ReadSystemFile("/proc/self/mountinfo", mountTable)) {
        syslog(LOG_ERR, "info: cannot read the system's figures [%s]", strerror(errno));
        response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
        return;
    }
    Json::Value data(Json::objectValue);
    data["hostname"] = ValidUtf8(hostName);
    data["uptime"] = Json::UInt64(uptime);
    data["load"] = Describe(load);
    data["memory"] = Describe(memory);
    data["volumes"] = Volumes(mountTable);
    response->SetSuccess(data);
}

}  // namespace

void Info(ZOVA::APIRequest*, ZOVA::APIResponse* response) {
    Fenced("info", response, [&] { Answer(response); });
}

}  // namespace package
