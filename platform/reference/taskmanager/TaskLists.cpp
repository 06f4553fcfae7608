#include <string>

#include "Seam.h"
#include "common/Hex.h"
#include "common/RandomBytes.h"
#include "taskmanager/TaskStore.h"
#include "taskmanager/TaskSweep.h"

using reference::TaskStore;

namespace ZELM {

TaskMgr::TaskMgr(const char* givenOwner) : owner(givenOwner != nullptr ? givenOwner : "") {}

Json::Value TaskMgr::getAllTaskId(const char* prefix) const {
    Json::Value ids(Json::arrayValue);
    const std::string start(prefix != nullptr ? prefix : "");
    if (!reference::IsTaskOwner(owner) || start.size() > reference::kLongestTaskId) {
        return ids;
    }
    reference::SweepTasks();
    for (const std::string& id : TaskStore::List(owner, start)) {
        ids.append(id);
    }
    return ids;
}

std::string TaskUtil::getUniqueID(const char* owner, const char* prefix) {
    constexpr size_t kRandomBytes = 16;
    const std::string start(prefix != nullptr ? prefix : "");
    if (owner == nullptr || !reference::IsTaskOwner(owner) || !reference::IsTaskPrefix(start)) {
        return "";
    }
    reference::SweepTasks();
    // 128 random bits meet no other id, and nobody who could take it first guesses it.
    char random[kRandomBytes];
    return reference::FillRandom(random, sizeof(random)) ? start + reference::HexText({random, sizeof(random)}) : "";
}

bool TaskUtil::checkTaskExists(const char* owner, const char* id) {
    const auto key = reference::MakeTaskKey(owner, id);
    TaskStore::Entry entry;
    reference::SweepTasks();
    return key && TaskStore::Load(*key, entry) == TaskStore::Result::kGood;
}

}  // namespace ZELM
