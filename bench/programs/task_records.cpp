// Fills the store of task records for measurements, and empties it again:
//
//   task_records make OWNER PREFIX COUNT   makes finished tasks of the owner and prints their ids; as root or the owner
//   task_records remove OWNER PREFIX       removes all tasks of the owner whose id begins with the prefix; as root

#include <taskmanager.h>

#include <cstdlib>
#include <cstring>
#include <iostream>
#include <string>

namespace {

/** The properties of a task as a package starts it. It stays until it is removed. */
bool Make(const char* owner, const char* prefix, const std::string& id) {
    Json::Value info(Json::objectValue);
    info["api"] = "ZOVA.Bench.Work.Task";
    info["version"] = 1;
    info["method"] = "start";
    info["group"] = "";
    info["prefix"] = prefix;
    info["param"] = Json::Value(Json::objectValue);
    Json::Value body(Json::objectValue);
    body["data"] = Json::Value(Json::objectValue);
    body["success"] = true;

    ZELM::Task task(owner, id.c_str());
    task.beginUpdate();
    task.setProperty("info", info);
    task.setProperty("auto_remove", false);
    task.setProperty("body", body);
    task.setProperty("task_run", true);
    return task.endUpdate() && task.finish(false);
}

int MakeAll(const char* owner, const char* prefix, int count) {
    for (int number = 0; number < count; ++number) {
        const std::string id = ZELM::TaskUtil::getUniqueID(owner, prefix);
        if (!Make(owner, prefix, id)) {
            std::cerr << "record " << number << " of " << owner << " cannot be made\n";
            return EXIT_FAILURE;
        }
        std::cout << id << '\n';
    }
    return EXIT_SUCCESS;
}

int RemoveAll(const char* owner, const char* prefix) {
    for (const Json::Value& id : ZELM::TaskMgr(owner).getAllTaskId(prefix)) {
        if (!ZELM::Task(owner, id.asCString()).remove()) {
            std::cerr << "record " << id.asString() << " of " << owner << " cannot be removed\n";
            return EXIT_FAILURE;
        }
    }
    return EXIT_SUCCESS;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc == 5 && strcmp(argv[1], "make") == 0) {
        return MakeAll(argv[2], argv[3], atoi(argv[4]));
    }
    if (argc == 4 && strcmp(argv[1], "remove") == 0) {
        return RemoveAll(argv[2], argv[3]);
    }
    std::cerr << "usage: task_records make OWNER PREFIX COUNT | task_records remove OWNER PREFIX\n";
    return EXIT_FAILURE;
}
