#include "RecordList.h"

#include <errno.h>
#include <string.h>
#include <syslog.h>
#include <webapi/Json.h>

#include <algorithm>

#include "DeviceFolder.h"
#include "Parameters.h"
#include "PrivateFile.h"
#include "Text.h"

namespace package {
namespace {

/** A list that was written by hand may be laid out with blanks. */
constexpr std::size_t kLongestFile = 4 * kLongestRecordList;

bool IsDeeperThan(const Json::Value& value, int levels) {
    if (!value.isArray() && !value.isObject()) {
        return false;
    }
    return levels == 0 || std::any_of(value.begin(), value.end(),
                                      [&](const Json::Value& inner) { return IsDeeperThan(inner, levels - 1); });
}

bool IsKnown(const std::string& name, const char* const* known) {
    while (*known != nullptr && name != *known) {
        ++known;
    }
    return *known != nullptr;
}

/** Answers and logs that the file could not be used. */
void RefuseFile(const RecordList& list, ZOVA::APIResponse* response, PrivateFileResult result) {
    const bool system = result == PrivateFileResult::kFailed;
    syslog(LOG_ERR, "%s/%s cannot be used: %s", DeviceFolder(), list.file,
           system ? strerror(errno) : "damaged, too long, or open to others than root");
    response->SetError(system ? RECORD_LIST_ERR_SYSTEM : RECORD_LIST_ERR_FILE, Json::Value());
}

void RefuseRecord(ZOVA::APIResponse* response, Json::ArrayIndex at, const RecordProblem& problem) {
    Json::Value errors(Json::objectValue);
    errors["record"] = at;
    if (!problem.member.empty()) {
        errors["member"] = ValidUtf8(problem.member);
    }
    errors["reason"] = problem.reason;
    response->SetError(RECORD_LIST_ERR_RECORD, errors);
}

}  // namespace

bool ReadRecords(const RecordList& list, ZOVA::APIResponse* response, Json::Value& out) {
    std::string text;
    PrivateFileResult result = ReadPrivateFile(DeviceFolder(), list.file, kLongestFile, text);
    if (result == PrivateFileResult::kMissing) {
        out = Json::Value(Json::arrayValue);
        return true;
    }
    Json::Value records;
    if (result == PrivateFileResult::kDone &&
        (!Json::fromString(records, text) || records.type() != Json::arrayValue)) {
        result = PrivateFileResult::kUntrusted;
    }
    if (result != PrivateFileResult::kDone) {
        RefuseFile(list, response, result);
        return false;
    }
    out = records;
    return true;
}

void ReplaceRecords(const RecordList& list, ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    const auto given = request->GetAndCheckArray(list.parameter, ZOVA::APIRequest::PARAM_REQUIRED);
    const Json::Value& records = given.Get();
    if (given.IsInvalid() || given.IsReset() || records.size() > list.most) {
        RefuseParameter(response, list.parameter);
        return;
    }
    const std::string text = Json::toString(records);
    if (text.size() > kLongestRecordList) {
        RefuseParameter(response, list.parameter);
        return;
    }
    for (Json::ArrayIndex at = 0; at < records.size(); ++at) {
        if (const auto problem = list.check(records, at)) {
            RefuseRecord(response, at, *problem);
            return;
        }
    }
    const PrivateFileResult result = ReplacePrivateFile(DeviceFolder(), list.file, text);
    if (result != PrivateFileResult::kDone) {
        RefuseFile(list, response, result);
        return;
    }
    syslog(LOG_AUTH | LOG_NOTICE, "%s/%s replaced by %s, %u records", DeviceFolder(), list.file,
           request->GetLoginUserName().c_str(), records.size());
    response->SetSuccess(Json::Value());
}

std::optional<RecordProblem> CheckForm(const Json::Value& record, const char* const* known) {
    if (record.type() != Json::objectValue) {
        return RecordProblem{"", "type"};
    }
    for (const std::string& name : record.getMemberNames()) {
        if (!IsKnown(name, known)) {
            return RecordProblem{name, "unknown"};
        }
        if (IsDeeperThan(record[name], kDeepestRecord - 1)) {
            return RecordProblem{name, "depth"};
        }
        const std::string text = Json::toString(record[name]);
        if (ValidUtf8(text) != text) {
            return RecordProblem{name, "characters"};
        }
    }
    return std::nullopt;
}

}  // namespace package
