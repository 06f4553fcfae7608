#pragma once

#include <unistd.h>

#include <csignal>
#include <string>

#include "TaskDevice.h"
#include "polling/APIPollingPrivate.h"
#include "taskmanager.h"
#include "webapi/APIPolling.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"

// ---- work functions ----

/** Reports at once and then works until it is stopped. */
inline void ReportAndWork(ZOVA::APIRequest*, ZOVA::APIResponse* response, void*) {
    response->SetSuccess(Json::Value("working"));
    for (;;) {
        pause();
    }
}

inline void ReportAndEnd(ZOVA::APIRequest*, ZOVA::APIResponse* response, void*) {
    response->SetSuccess(Json::Value("done"));
}

/** One call of one user that handles tasks. */
class TaskCall {
public:
    explicit TaskCall(const std::string& user, const std::string& params = "{}")
        : request(RequestOf(user, params)), response(&request), polling(&request) {}
    TaskCall(const TaskCall&) = delete;
    TaskCall& operator=(const TaskCall&) = delete;

    bool Start(ZOVA::APIPolling::WorkFunc work, void* data = nullptr) { return polling.Start(&response, work, data); }
    std::string TaskId() const {
        return Json::asString(Json::member(Json::member(response.GetBody(), "data"), "task_id"));
    }
    std::string Body() const { return Json::toString(response.GetBody()); }
    Json::Value Status(const std::string& fullId) {
        Json::Value status;
        EXPECT_TRUE(polling.Status(fullId, status)) << fullId << " " << polling.GetError();
        return status;
    }

    ZOVA::APIRequest request;
    ZOVA::APIResponse response;
    ZOVA::APIPolling polling;
};

/** Starts each test with an empty store, and ends what is left of the tasks that it started. */
class PollingTest : public TaskTest {
protected:
    void TearDown() override {
        for (const char* owner : {"alice", "bob", "boss", "@users", "@administrators"}) {
            for (const Json::Value& id : ZELM::TaskMgr(owner).getAllTaskId(nullptr)) {
                const int pid = ZELM::Task(owner, id.asCString()).getCreatePid();
                if (pid > 0) {
                    kill(pid, SIGKILL);
                }
            }
        }
    }

    static std::string OwnerOf(const std::string& fullId) { return fullId.substr(0, fullId.find('/')); }
    static std::string IdOf(const std::string& fullId) { return fullId.substr(fullId.find('/') + 1); }
    static int PidOf(const std::string& fullId) {
        return ZELM::Task(OwnerOf(fullId).c_str(), IdOf(fullId).c_str()).getCreatePid();
    }
    static bool IsFinished(const std::string& fullId) {
        return ZELM::Task(OwnerOf(fullId).c_str(), IdOf(fullId).c_str()).isFinished();
    }
};
