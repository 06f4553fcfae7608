#include "UploadDeferred.h"

#include <fcntl.h>
#include <unistd.h>
#include <webapi/APIUpload.h>
#include <webapi/Json.h>

#include <algorithm>
#include <string>

#include "../common/Fence.h"
#include "../common/Parameters.h"
#include "../common/Text.h"
#include "Caller.h"
#include "ClientPath.h"
#include "Places.h"
#include "Requests.h"
#include "UploadProgress.h"
#include "UploadWishes.h"

namespace package {
namespace {

/** Statuses of the framework. */
constexpr int kComplete = 1;
constexpr int kGoesOn = 0;
constexpr std::size_t kLongestTicket = 16;
constexpr char kTicket[] = "ticket";

/** What the callback of the framework, which takes no argument of ours, works on. */
struct Going {
    UploadProgress progress;
    bool isStopped = false;
};

Going* going = nullptr;

void Tell(unsigned long long taken, unsigned long long length) {
    if (going == nullptr || going->isStopped || !going->progress.IsRunning() || going->progress.Tell(taken, length)) {
        return;
    }
    going->isStopped = true;
    // The file under way is given up as one whose body ended.
    const UniqueFd nothing(open("/dev/null", O_RDONLY | O_CLOEXEC));
    if (nothing.IsOpen()) {
        dup2(nothing.Get(), STDIN_FILENO);
    }
}

bool IsTicket(const std::string& text) {
    return !text.empty() && text.size() <= kLongestTicket && std::all_of(text.begin(), text.end(), [](char c) {
        return (c >= '0' && c <= '9') || (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z');
    });
}

/** One upload from its first byte to its answer. */
class DeferredUpload {
public:
    DeferredUpload(ZOVA::APIRequest* call, ZOVA::APIResponse* answer)
        : request(call), response(answer), upload(call), params(call->GetParam("", Json::Value(Json::objectValue))) {
        going = &state;
        upload.SetUploadCallback(Tell);
    }
    DeferredUpload(const DeferredUpload&) = delete;
    DeferredUpload& operator=(const DeferredUpload&) = delete;
    ~DeferredUpload() { going = nullptr; }

    void Run();

private:
    bool Begin();
    int TakeFile(const Json::Value& fields);
    void PlaceOne(const std::string& field, const std::string& part, const std::string& clientName);
    void Answer(int status);

    ZOVA::APIRequest* request;
    ZOVA::APIResponse* response;
    ZOVA::APIUpload upload;
    Json::Value params;
    UploadWishes wishes;
    UniqueFd folder;
    Results results;
    Going state;
    bool isFirst = true;
};

void DeferredUpload::Run() {
    for (;;) {
        Json::Value fields(Json::objectValue);
        int status = upload.GetUploadParam(fields);
        if (isFirst) {
            for (const std::string& name : fields.getMemberNames()) {
                params[name] = fields[name];
            }
        }
        if (status == kGoesOn) {
            if (isFirst && !Begin()) {
                return;
            }
            status = TakeFile(fields);
            isFirst = false;
        }
        if (status != kGoesOn) {
            Answer(status);
            return;
        }
    }
}

/** Everything that does not depend on a file, once the first one is reached. False with the answer made. */
bool DeferredUpload::Begin() {
    const Json::Value& ticket = Json::member(params, kTicket);
    // A ticket of digits in the query string is a number.
    const std::string text = ticket.isString() || ticket.isIntegral() ? Json::asString(ticket) : "";
    const char* bad = wishes.Read(params);
    if (bad != nullptr || !IsTicket(text)) {
        RefuseParameter(response, bad != nullptr ? bad : kTicket);
        return false;
    }
    const FileError error = OpenTarget(CurrentCaller(), wishes.Path(), folder);
    if (error != FILE_OK) {
        Refuse(response, error);
        return false;
    }
    if (!state.progress.Start(request, kUploadPrefix + text + "-")) {
        response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
        return false;
    }
    return true;
}

/** Stores the file that was reached and puts it in its place. @return the framework's status. */
int DeferredUpload::TakeFile(const Json::Value& fields) {
    Json::Value stored(Json::objectValue);
    const int status = upload.GetUploadFile(stored);
    if (status >= kGoesOn && !state.isStopped) {
        for (const std::string& field : stored.getMemberNames()) {
            PlaceOne(field, Json::asString(stored[field]), Json::asString(Json::member(fields, field)));
        }
    }
    return status;
}

void DeferredUpload::PlaceOne(const std::string& field, const std::string& part, const std::string& clientName) {
    Placed placed;
    const Arrival arrival{part, wishes.NameFor(field, isFirst).value_or(clientName), wishes.TimeFor(field, isFirst)};
    if (IsNewName(arrival.name)) {
        placed = PlaceFile(folder.Get(), arrival, wishes.WhatIfThere());
    } else {
        placed.error = FILE_ERR_BAD_PATH;
    }
    results.Add(Join(wishes.Path(), arrival.name), placed.error, UploadRow(ValidUtf8(field), placed));
    // What was not moved need not wait for the end of the process.
    unlink(part.c_str());
}

void DeferredUpload::Answer(int status) {
    Json::Value details(Json::objectValue);
    details["results"] = results.Rows();
    if (state.isStopped) {
        response->SetError(FILE_ERR_BROKEN_OFF, details);
    } else if (status != kComplete) {
        details["upload_err"] = status;
        response->SetError(ZOVA::WEBAPI_ERR_UPLOAD_FAILED, details);
    } else if (isFirst) {
        RefuseParameter(response, "file");
    } else if (results.FirstError() != FILE_OK) {
        response->SetError(results.FirstError(), details);
    } else {
        details["task_id"] = state.progress.TaskId();
        response->SetSuccess(details);
    }
    if (!isFirst) {
        state.progress.End(response->GetBody());
    }
}

}  // namespace

void UploadDeferred(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    Fenced("upload_deferred", response, [&] { DeferredUpload(request, response).Run(); });
}

}  // namespace package
