#include <functional>
#include <optional>
#include <string>

#include "Seam.h"
#include "taskmanager/TaskProcess.h"
#include "taskmanager/TaskStore.h"
#include "taskmanager/TaskSweep.h"
#include "taskmanager/TaskWait.h"

using reference::TaskRecord;
using reference::TaskStore;

namespace ZELM {

class Task::State {
public:
    State(const char* owner, const char* id)
        : key(reference::MakeTaskKey(owner, id)), givenId(id != nullptr ? id : "") {
        Load();
    }

    bool Load() {
        known = key && TaskStore::Load(*key, entry) == TaskStore::Result::kGood;
        wasThere = wasThere || known;
        return known;
    }

    /** Applies the change to the stored record, whatever other processes made of it meanwhile. */
    bool Store(const std::function<void(TaskRecord&)>& change) {
        known = key && TaskStore::Update(*key, !wasThere, change, entry) == TaskStore::Result::kGood;
        wasThere = wasThere || known;
        return known;
    }

    const Json::Value& Property(const char* name) const {
        const Json::Value& properties = entry.record.properties;
        return known && name != nullptr ? properties[name] : Json::Value::nullSingleton();
    }

    bool HasProperty(const char* name) const {
        return known && name != nullptr && entry.record.properties.isMember(name);
    }

    std::optional<reference::TaskKey> key;
    std::string givenId;
    /** What was read last; of no meaning unless `known`. */
    TaskStore::Entry entry;
    bool known = false;
    /** A record that was there once is not made anew. */
    bool wasThere = false;
    bool updating = false;
    Json::Value pending = Json::Value(Json::objectValue);
};

Task::Task(const char* owner, const char* id) : state(new State(owner, id)) {}

Task::~Task() = default;

const char* Task::getTaskId() const {
    return state->givenId.c_str();
}

void Task::beginUpdate() {
    state->updating = true;
}

bool Task::endUpdate() {
    if (!state->updating) {
        return false;
    }
    state->updating = false;
    Json::Value pending(Json::objectValue);
    pending.swap(state->pending);
    return state->Store([&pending](TaskRecord& record) {
        for (auto property = pending.begin(); property != pending.end(); ++property) {
            record.properties[property.name()] = *property;
        }
    });
}

bool Task::setProperty(const char* name, const Json::Value& value) {
    if (name == nullptr || !state->key) {
        return false;
    }
    if (state->updating) {
        state->pending[name] = value;
        return true;
    }
    return state->Store([&](TaskRecord& record) { record.properties[name] = value; });
}

Json::Value Task::getProperty(const char* name) const {
    return state->Property(name);
}

bool Task::hasProperty(const char* name) const {
    return state->HasProperty(name);
}

bool Task::getBoolProperty(const char* name, bool fallback) const {
    const Json::Value& value = state->Property(name);
    return value.isBool() ? value.asBool() : fallback;
}

bool Task::setCreatePid(int pid) {
    return state->Store([pid](TaskRecord& record) {
        record.pid = pid > 0 ? pid : 0;
        record.processStart = reference::ProcessStart(pid);
    });
}

int Task::getCreatePid() const {
    const TaskRecord& record = state->entry.record;
    if (!state->known || !reference::IsProcessRunning(record.pid, record.processStart)) {
        return 0;
    }
    // What a user wrote must not aim root's signals at the processes of others.
    const uid_t user = state->entry.user;
    return user == 0 || reference::HasProcessUser(record.pid, user) ? record.pid : 0;
}

bool Task::reload() {
    return state->Load();
}

bool Task::finish(bool remove) {
    const bool stored = state->Store([remove](TaskRecord& record) {
        if (remove && !record.removed) {
            record.removed = true;
            record.removedAt = reference::SecondsSinceBoot();
        }
        record.finished = true;
    });
    reference::SweepTasks();
    return stored;
}

bool Task::isFinished() const {
    return state->known && state->entry.record.finished;
}

bool Task::remove() {
    state->known = false;
    return state->key && TaskStore::Remove(*state->key);
}

bool Task::waitForDataReady(const char* name, int seconds) {
    if (name == nullptr || !state->key) {
        return false;
    }
    const bool ready = reference::WaitForTaskProperty(*state->key, name, seconds);
    state->Load();
    return ready;
}

}  // namespace ZELM
