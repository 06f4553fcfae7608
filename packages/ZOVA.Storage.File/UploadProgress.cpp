#include "UploadProgress.h"

#include <errno.h>
#include <string.h>
#include <sys/socket.h>
#include <syslog.h>
#include <time.h>
#include <webapi/APIPolling.h>
#include <webapi/Json.h>

#include <utility>
#include <vector>

#include "FileErrors.h"

namespace package {
namespace {

constexpr std::int64_t kTellMilliseconds = 500;
/** Far below what such a socket takes at once. */
constexpr std::size_t kLongestReport = 64 * 1024;

struct Ends {
    UniqueFd mine;
    UniqueFd tasks;
};

std::int64_t MonotonicMilliseconds() {
    timespec now = {};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<std::int64_t>(now.tv_sec) * 1000 + now.tv_nsec / 1000000;
}

Json::Value Report(std::uint64_t taken, std::uint64_t length) {
    Json::Value report(Json::objectValue);
    report["taken"] = Json::UInt64(taken);
    report["length"] = Json::UInt64(length);
    report["done"] = false;
    return report;
}

/** Takes over an outcome as it is. */
void SetOutcome(ZOVA::APIResponse* response, const Json::Value& body) {
    const Json::Value& error = Json::member(body, "error");
    if (error.isNull()) {
        Json::Value data = Json::member(body, "data");
        data["done"] = true;
        response->SetSuccess(data);
    } else {
        response->SetError(Json::asInt(Json::member(error, "code")), Json::member(error, "errors"));
    }
}

/** The task: reports what it is told until the outcome comes, or the upload's process is gone. */
void Watch(ZOVA::APIRequest*, ZOVA::APIResponse* response, void* data) {
    auto& ends = *static_cast<Ends*>(data);
    // Otherwise the end of the upload's process would not show.
    ends.mine.Reset(-1);
    response->SetSuccess(Report(0, 0));
    std::vector<char> buffer(kLongestReport);
    for (;;) {
        const ssize_t got = recv(ends.tasks.Get(), buffer.data(), buffer.size(), 0);
        if (got < 0 && errno == EINTR) {
            continue;
        }
        Json::Value told;
        if (got <= 0 || !Json::fromString(told, std::string(buffer.data(), static_cast<std::size_t>(got)))) {
            response->SetError(FILE_ERR_BROKEN_OFF, Json::Value());
            return;
        }
        if (Json::hasMember(told, "success")) {
            SetOutcome(response, told);
            return;
        }
        response->SetSuccess(told);
    }
}

}  // namespace

bool UploadProgress::Start(ZOVA::APIRequest* request, const std::string& prefix) {
    int pair[2] = {-1, -1};
    if (socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, pair) != 0) {
        syslog(LOG_ERR, "no way to tell how far an upload is: %s", strerror(errno));
        return false;
    }
    Ends ends{UniqueFd(pair[0]), UniqueFd(pair[1])};
    ZOVA::APIPolling polling(request);
    ZOVA::APIResponse answer(request);
    polling.SetPrefixAttr(prefix);
    if (!polling.Start(&answer, Watch, &ends)) {
        return false;
    }
    taskId = Json::asString(Json::member(Json::member(answer.GetBody(), "data"), "task_id"));
    channel = std::move(ends.mine);
    return true;
}

bool UploadProgress::Tell(std::uint64_t taken, std::uint64_t length) {
    const std::int64_t now = MonotonicMilliseconds();
    if (now - toldAt < kTellMilliseconds) {
        return true;
    }
    toldAt = now;
    // One that does not get through is followed by others.
    return Send(Report(taken, length), MSG_DONTWAIT) || errno == EAGAIN;
}

void UploadProgress::End(const Json::Value& body) {
    Json::Value last = body;
    if (Json::toString(last).size() > kLongestReport) {
        last["data"] = Json::Value(Json::objectValue);
        if (Json::hasMember(last, "error")) {
            last["error"].removeMember("errors");
        }
    }
    Send(last, 0);
    channel.Reset(-1);
}

bool UploadProgress::Send(const Json::Value& report, int flags) {
    const std::string text = Json::toString(report);
    return send(channel.Get(), text.data(), text.size(), flags | MSG_NOSIGNAL) >= 0;
}

}  // namespace package
