#pragma once

#include <cstdint>
#include <string>

#include "webapi/APIBase.h"
#include "webapi/APIPolling.h"

namespace ZELM {
class Task;
}

/** Lines of this subsystem bear one name, whichever file they come from. */
#define POLLING_LOG(text, ...) WEBAPI_LOG_AS("APIPolling", LOG_ERR, text __VA_OPT__(, ) __VA_ARGS__)

namespace ZOVA {

constexpr const char* kPollingAttributes = "polling_attribute";
constexpr const char* kAdministratorsOwner = "@administrators";
constexpr const char* kUsersOwner = "@users";

/** The store takes C texts: an owner, prefix or id that holds a NUL must not pass for what stands before it. */
inline bool HasNul(const std::string& text) {
    return text.find('\0') != std::string::npos;
}

class APIPollingPrivate : public APIBase {
public:
    APIPollingPrivate(APIPolling* polling, APIRequest* request);
    APIPollingPrivate(const APIPollingPrivate&) = delete;
    APIPollingPrivate& operator=(const APIPollingPrivate&) = delete;
    ~APIPollingPrivate() override;

    // Names and ownership.
    /** Parts the full id at its first "/"; false without one, the outputs are then left alone. */
    static bool GetUserAndTaskID(const std::string& fullId, std::string& owner, std::string& id);
    /** Whether the caller may ask for that owner's tasks. Needs a request. */
    bool CheckTaskUser(const std::string& owner) const;
    /** Ids as the task store lists them, each made full; null for none. */
    static Json::Value ConverToFullTaskId(const std::string& owner, const Json::Value& ids);
    /** SIGTERM to that process alone. True also if it has gone. */
    static bool DoKill(int pid);

    bool Start(APIResponse* response, APIPolling::WorkFunc work, void* argument);
    bool Status(const std::string& fullId, Json::Value& out);
    bool Status(const Json::Value& fullIds, Json::Value& out);
    bool Stop(const std::string& fullId, bool remove);
    bool List(const std::string& prefix, const Json::Value& groups, Json::Value& out);

    /** Stores the error and returns false. */
    bool Fail(int code);
    void SetError(int code) { error = code; }
    int GetError() const { return error; }

    APIPolling* polling;
    APIRequest* request;
    std::int32_t error;

private:
    bool OwnerOfGroup(const std::string& group, APIResponse& response, std::string& owner) const;
    Json::Value DescribeTask(const std::string& group, const std::string& prefix, bool withoutParams) const;
    [[noreturn]] void RunChild(ZELM::Task& task, const std::string& owner, APIResponse* response,
                               APIPolling::WorkFunc work, void* argument);
};

}  // namespace ZOVA
