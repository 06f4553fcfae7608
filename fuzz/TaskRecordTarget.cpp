// Background tasks: the input as the content of a record, as a full task id, as a file name in the store, as a prefix.

#include <unistd.h>

#include <string>
#include <string_view>

#include "Check.h"
#include "Target.h"
#include "common/JsonText.h"
#include "polling/APIPollingPrivate.h"
#include "taskmanager.h"
#include "taskmanager/TaskKey.h"
#include "taskmanager/TaskRecord.h"
#include "taskmanager/TaskStore.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/Json.h"

namespace {

using reference::TaskKey;
using reference::TaskRecord;
using ZOVA::APIPollingPrivate;

constexpr const char* kUntouched = "as before";
constexpr size_t kLongestFileName = 255;
/** The tasks that there are, in a store of this build alone. */
constexpr const char* kTasks[][2] = {{"alice", "1"}, {"@users", "copy-1"}, {"@administrators", "1"}};

// ---- records ----

/** The key that the text claims to be of, if it is one. */
TaskKey KeyOf(const std::string& text) {
    Json::Value document;
    if (reference::ParseJson(text, document)) {
        const std::string owner = reference::JsonTextMember(document, "owner");
        const std::string id = reference::JsonTextMember(document, "id");
        if (const auto key = reference::MakeTaskKey(owner.c_str(), id.c_str())) {
            return *key;
        }
    }
    return {"alice", "1"};
}

void CheckGood(const TaskKey& key, const TaskRecord& record) {
    FUZZ_CHECK(record.pid >= 0 && record.properties.type() == Json::objectValue);
    const std::string text = reference::WriteTaskRecord(key, record);
    TaskRecord again;
    FUZZ_CHECK(reference::ParseTaskRecord(text, key, again));
    FUZZ_CHECK(again.pid == record.pid && again.processStart == record.processStart);
    FUZZ_CHECK(again.finished == record.finished && again.removed == record.removed);
    FUZZ_CHECK(again.removedAt == record.removedAt && again.properties == record.properties);
    FUZZ_CHECK(reference::WriteTaskRecord(key, again) == text);
    FUZZ_CHECK(!reference::ParseTaskRecord(text, {key.owner + "x", key.id}, again));
    FUZZ_CHECK(!reference::ParseTaskRecord(text, {key.owner, key.id + "x"}, again));

    const bool isOver = record.finished && record.removed;
    FUZZ_CHECK(!record.IsExpired(record.removedAt));
    FUZZ_CHECK(record.removedAt == 0 || record.IsExpired(record.removedAt - 1) == isOver);
    const std::uint64_t later = record.removedAt + reference::kTaskKeptSeconds;
    FUZZ_CHECK(record.IsExpired(later) == isOver);
}

void CheckRecord(const std::string& text) {
    const TaskKey key = KeyOf(text);
    TaskRecord record;
    record.pid = -1;
    record.properties[kUntouched] = true;
    if (reference::ParseTaskRecord(text, key, record)) {
        CheckGood(key, record);
    } else {
        FUZZ_CHECK(record.pid == -1 && record.properties.isMember(kUntouched));
    }
}

// ---- names ----

bool IsFileNameByte(char c) {
    return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '.' || c == '_' ||
           c == '-';
}

/** Checks that the key's file is one of the store, and stands for no other key. */
void CheckKey(const TaskKey& key) {
    const std::string name = key.FileName();
    FUZZ_CHECK(!name.empty() && name.size() <= kLongestFileName && name.front() != '.');
    FUZZ_CHECK(key.id.front() != '.' && key.id.front() != '-');
    for (const char byte : name) {
        FUZZ_CHECK(IsFileNameByte(byte));
    }
    FUZZ_CHECK(reference::TaskStore::PathOf(key) == ZOVA_REFERENCE_ROOT "/run/zova/tasks/" + name);
    const auto read = reference::KeyOfTaskFile(name);
    FUZZ_CHECK(read && read->owner == key.owner && read->id == key.id);
    FUZZ_CHECK(reference::IdOfTaskFile(name, key.owner) == key.id);
    FUZZ_CHECK(reference::IdOfTaskFile(name, key.owner + "x").empty());
}

void CheckFileName(const std::string& text) {
    if (const auto key = reference::KeyOfTaskFile(text)) {
        CheckKey(*key);
        FUZZ_CHECK(key->FileName() == text);
    }
    FUZZ_CHECK(reference::IdOfTaskFile(text, "alice").empty() || reference::KeyOfTaskFile(text));
}

void CheckPrefix(const std::string& text) {
    const std::string prefix = text.c_str();
    const std::string id = ZELM::TaskUtil::getUniqueID("alice", prefix.c_str());
    FUZZ_CHECK(id.empty() == !reference::IsTaskPrefix(prefix));
    if (!id.empty()) {
        FUZZ_CHECK(id.compare(0, prefix.size(), prefix) == 0);
        const auto key = reference::MakeTaskKey("alice", id.c_str());
        FUZZ_CHECK(key);
        CheckKey(*key);
    }
}

// ---- what a client asks for ----

/** A call of that user. */
class Call {
public:
    explicit Call(const std::string& user) : request(SessionOf(user)), polling(nullptr, &request) {}

    APIPollingPrivate& Polling() { return polling; }

private:
    static Json::Value SessionOf(const std::string& user) {
        Json::Value init(Json::objectValue);
        init["session"]["username"] = user;
        init["session"]["isAdmin"] = false;
        return init;
    }

    ZOVA::APIRequest request;
    APIPollingPrivate polling;
};

/** Whether it is one of the tasks that somebody who is no administrator can see. */
bool IsTask(const std::string& fullId) {
    for (const auto& task : kTasks) {
        if (task[0] != std::string_view(reference::kAdministratorsOwner) &&
            fullId == std::string(task[0]) + "/" + task[1]) {
            return true;
        }
    }
    return false;
}

void CheckParts(const std::string& fullId, std::string& owner, std::string& id) {
    const bool parted = APIPollingPrivate::GetUserAndTaskID(fullId, owner, id);
    FUZZ_CHECK(parted == (fullId.find('/') != std::string::npos));
    if (!parted) {
        FUZZ_CHECK(owner == kUntouched && id == kUntouched);
        return;
    }
    FUZZ_CHECK(owner.find('/') == std::string::npos && owner + "/" + id == fullId);
    Json::Value ids(Json::arrayValue);
    ids.append(id);
    const Json::Value full = APIPollingPrivate::ConverToFullTaskId(owner, ids);
    FUZZ_CHECK(owner.empty() ? full.isNull() : full.size() == 1 && full[0] == fullId);
    if (const auto key = reference::MakeTaskKey(owner.c_str(), id.c_str())) {
        CheckKey(*key);
    }
}

void CheckQueries(const std::string& fullId, const std::string& user) {
    Call call(user);
    const bool isTask = IsTask(fullId);
    Json::Value status(kUntouched);
    FUZZ_CHECK(call.Polling().Status(fullId, status) == isTask);
    FUZZ_CHECK(isTask ? status["finish"].isBool() : status == kUntouched);
    const int error = call.Polling().GetError();
    FUZZ_CHECK(isTask || error == (fullId.empty() ? ZOVA::POLLING_ERR_BAD_PARAMETERS : ZOVA::POLLING_ERR_BAD_TASK_ID) ||
               error == ZOVA::POLLING_ERR_NO_SUCH_TASK);
    Json::Value several(Json::arrayValue);
    several.append(fullId);
    FUZZ_CHECK(call.Polling().Status(several, status) && status.size() <= 1);
    FUZZ_CHECK(Json::hasMember(Json::member(status, fullId), "finish") == isTask);
    FUZZ_CHECK(call.Polling().Stop(fullId, false) == isTask);
}

void CheckList(const std::string& prefix) {
    Call call("alice");
    Json::Value groups(Json::arrayValue);
    groups.append("user");
    groups.append("everyone");
    Json::Value lists(Json::objectValue);
    FUZZ_CHECK(call.Polling().List(prefix, groups, lists));
    for (const Json::Value& list : lists) {
        for (const Json::Value& fullId : list) {
            const std::string text = Json::asString(fullId);
            FUZZ_CHECK(IsTask(text));
            FUZZ_CHECK(text.compare(text.find('/') + 1, prefix.size(), prefix) == 0);
        }
    }
}

/** Puts the tasks into the store. False without the rights for it. */
bool MakeTasks() {
    for (const auto& task : kTasks) {
        if (geteuid() != 0 || !ZELM::Task(task[0], task[1]).setProperty("info", true)) {
            return false;
        }
    }
    return true;
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static const bool hasStore = MakeTasks();
    const std::string text = fuzz::TextOf(data, size);
    CheckRecord(text);
    CheckFileName(text);
    CheckPrefix(text);
    std::string owner = kUntouched;
    std::string id = kUntouched;
    CheckParts(text, owner, id);
    if (hasStore) {
        CheckQueries(text, owner);
        CheckQueries(text, "alice");
        CheckList(text);
    }
    return 0;
}
