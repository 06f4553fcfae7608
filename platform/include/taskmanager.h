#pragma once

// libtaskmanager.so.6: records of background tasks, shared by the processes of a device.

#include <json/value.h>

#include <memory>
#include <string>

namespace ZELM {

/**
 * The record of one task, named by owner and id. The object holds what it read last; only `reload` and its own writes
 * bring what other processes wrote since. A key that cannot name a task is that of a record that does not exist and
 * cannot be written. Nothing here throws.
 */
class Task {
public:
    /** Opens the record; one that does not exist is created by the first write. */
    Task(const char* owner, const char* id);
    Task(const Task&) = delete;
    Task& operator=(const Task&) = delete;
    ~Task();

    /** Valid as long as the object. */
    const char* getTaskId() const;

    /** Collects the writes up to `endUpdate`, which stores them at once. */
    void beginUpdate();
    /** @return whether the writes were stored: all or none. A record that has gone since it was read stays gone. */
    bool endUpdate();
    /** Writes a property. @return whether it was stored or, between `beginUpdate` and `endUpdate`, taken up. */
    bool setProperty(const char* name, const Json::Value& value);

    /** The property's value, null if it is absent. */
    Json::Value getProperty(const char* name) const;
    bool hasProperty(const char* name) const;
    bool getBoolProperty(const char* name, bool fallback) const;

    /** Records the process that works on the task. */
    bool setCreatePid(int pid);
    /** The recorded process id; 0 if there is none, or if that process has gone. */
    int getCreatePid() const;

    /** Reads the record again. @return false if there is none any more. */
    bool reload();
    /** Marks the record finished; true also means that it is to be removed. @return whether that was stored. */
    bool finish(bool remove);
    bool isFinished() const;
    /** Deletes the record. */
    bool remove();

    /**
     * Blocks until the property exists, at most that many seconds.
     * @return whether it exists. False before the time is up if the record has gone, or its process has without having
     *     finished the task.
     */
    bool waitForDataReady(const char* name, int seconds);

private:
    class State;
    std::unique_ptr<State> state;
};

/** The tasks of one owner. */
class TaskMgr {
public:
    explicit TaskMgr(const char* owner);

    /**
     * An array of the owner's ids that begin with the prefix, sorted; null stands for all. Empty where the process may
     * not list the store, which is root's to list.
     */
    Json::Value getAllTaskId(const char* prefix) const;

private:
    std::string owner;
};

class TaskUtil {
public:
    /** An id of no task of that owner, which begins with the prefix. "" for a prefix that no id can have. */
    static std::string getUniqueID(const char* owner, const char* prefix);
    static bool checkTaskExists(const char* owner, const char* id);
};

}  // namespace ZELM
