#pragma once

#include <json/value.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

#include <cstdint>
#include <string>

#include "../common/UniqueFd.h"

namespace package {

/**
 * The progress of an upload as a background task of its own, which others can look at while the upload's own call goes
 * on. The task's process does nothing but report; if it is stopped the upload is to stop, and if the upload's process
 * ends without a last word the task fails with 414.
 */
class UploadProgress {
public:
    UploadProgress() = default;
    UploadProgress(const UploadProgress&) = delete;
    UploadProgress& operator=(const UploadProgress&) = delete;

    /** Starts the task. @param prefix of its id. @return false if that failed; the log says why. */
    bool Start(ZOVA::APIRequest* request, const std::string& prefix);
    /** Between start and end. */
    bool IsRunning() const { return channel.IsOpen(); }
    /** Full id of the task. */
    const std::string& TaskId() const { return taskId; }

    /** Tells how far it is, at most twice a second. @return false if the task was stopped. */
    bool Tell(std::uint64_t taken, std::uint64_t length);
    /** Tells the outcome, the body of the call's own answer, and ends the task. */
    void End(const Json::Value& body);

private:
    bool Send(const Json::Value& report, int flags);

    UniqueFd channel;
    std::string taskId;
    std::int64_t toldAt = 0;
};

}  // namespace package
