#include "dispatcher/UsageCounter.h"

#include <json/value.h>

#include <ctime>
#include <limits>

#include "webapi/APIRequest.h"
#include "webapi/APIRunner.h"
#include "webapi/Json.h"
#include "zovacore.h"
#include "zovasdk.h"

namespace ZOVA {

namespace {

constexpr const char* kSettingsPath = "/etc/zovainfo.conf";
constexpr const char* kCounterDirectory = "/var/spool/webapi";
constexpr unsigned int kCounterDirectoryMode = 0600;
constexpr int kExclusiveLock = 1;
constexpr int kLockSeconds = 2;
constexpr int kGroupComponents = 4;

/** The API name up to, not including, its fourth dot. */
std::string GroupOf(const std::string& api) {
    std::size_t end = std::string::npos;
    for (int component = 0; component < kGroupComponents; ++component) {
        end = api.find('.', component == 0 ? 0 : end + 1);
        if (end == std::string::npos) {
            return api;
        }
    }
    return api.substr(0, end);
}

/** Makes the directory, once per process; a failure is tried again at the next count. */
bool PrepareDirectory(const std::string& directory) {
    static bool prepared = false;
    if (!prepared) {
        if (ZOVAFSMkdirP(directory.c_str(), 0, 0, -1, -1, kCounterDirectoryMode) < 0) {
            return false;
        }
        QLIBCFileTouch((directory + "/.timestamp").c_str());
        prepared = true;
    }
    return true;
}

bool AddOne(const std::string& path, const std::string& key) {
    Json::Value counters;
    if (!Json::fromFile(counters, path) || counters.type() != Json::objectValue) {
        counters = Json::Value(Json::objectValue);
    }
    Json::Value& counter = counters[key];
    if (counter.type() == Json::objectValue) {
        const Json::Int64 count = Json::asInt64(Json::member(counter, "count"));
        counter["count"] = count < std::numeric_limits<Json::Int64>::max() ? count + 1 : count;
    } else {
        counter = Json::Value(Json::objectValue);
        counter["count"] = 1;
        counter["ctime"] = static_cast<Json::Int64>(time(nullptr));
    }
    return Json::toFile(counters, path);
}

}  // namespace

bool CountUsage(const std::string& directory, const std::string& api, const std::string& method, int version) {
    if (!PrepareDirectory(directory)) {
        return false;
    }
    const std::string path = directory + "/" + GroupOf(api) + ".json";
    int lock = -1;
    if (QLIBCFileLockTimeByFile((path + ".lock").c_str(), kExclusiveLock, kLockSeconds, &lock) < 0) {
        return false;
    }
    const bool counted = AddOne(path, api + "_" + std::to_string(version) + "_" + method);
    if (lock != -1) {
        QLIBCFileUnlockByFile(lock);
    }
    return counted;
}

void APIRunner::IncreaseCounter(APIRequest* call) {
    static const bool enabled = QLIBCFileCheckKeyValue(kSettingsPath, "enable_data_collect", "yes", 0) != 0;
    if (enabled) {
        CountUsage(kCounterDirectory, call->GetAPIClass(), call->GetAPIMethod(), call->GetAPIVersion());
    }
}

}  // namespace ZOVA
