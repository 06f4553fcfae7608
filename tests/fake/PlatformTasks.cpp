// The task store, which the unit tests do not model: the tests of tasks use the real one. Any call ends the test.

#include "FakePlatform.h"
#include "taskmanager.h"

using fake::Unmodelled;

namespace ZELM {

class Task::State {};

Task::Task(const char*, const char*) {
    Unmodelled("Task");
}

Task::~Task() = default;

const char* Task::getTaskId() const {
    Unmodelled("getTaskId");
}

void Task::beginUpdate() {
    Unmodelled("beginUpdate");
}

bool Task::endUpdate() {
    Unmodelled("endUpdate");
}

bool Task::setProperty(const char*, const Json::Value&) {
    Unmodelled("setProperty");
}

Json::Value Task::getProperty(const char*) const {
    Unmodelled("getProperty");
}

bool Task::hasProperty(const char*) const {
    Unmodelled("hasProperty");
}

bool Task::getBoolProperty(const char*, bool) const {
    Unmodelled("getBoolProperty");
}

bool Task::setCreatePid(int) {
    Unmodelled("setCreatePid");
}

int Task::getCreatePid() const {
    Unmodelled("getCreatePid");
}

bool Task::reload() {
    Unmodelled("reload");
}

bool Task::finish(bool) {
    Unmodelled("finish");
}

bool Task::isFinished() const {
    Unmodelled("isFinished");
}

bool Task::remove() {
    Unmodelled("remove");
}

bool Task::waitForDataReady(const char*, int) {
    Unmodelled("waitForDataReady");
}

TaskMgr::TaskMgr(const char*) {
    Unmodelled("TaskMgr");
}

Json::Value TaskMgr::getAllTaskId(const char*) const {
    Unmodelled("getAllTaskId");
}

std::string TaskUtil::getUniqueID(const char*, const char*) {
    Unmodelled("getUniqueID");
}

bool TaskUtil::checkTaskExists(const char*, const char*) {
    Unmodelled("checkTaskExists");
}

}  // namespace ZELM
