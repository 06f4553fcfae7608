#pragma once

#include <functional>
#include <string>
#include <vector>

#include "common/UniqueFd.h"
#include "taskmanager/TaskKey.h"
#include "taskmanager/TaskRecord.h"

namespace reference {

/**
 * The record files: one for each task in one folder, replaced as a whole under a lock on the file itself, so that a
 * reader sees an old record or a new one.
 *
 * Everybody may make files in the folder and read their own; what says whether a record is believed is the file's
 * owner (`MayKeepTasks`), and that the record names the key by which it was looked up.
 */
class TaskStore {
public:
    enum class Result {
        kGood,
        /** No such record; one that has expired is removed and counts as none. */
        kMissing,
        /** There is something that is no record to be believed, or the folder cannot be used. */
        kRefused,
    };

    struct Entry {
        TaskRecord record;
        /** Owner of the file. */
        uid_t user = 0;
    };

    static Result Load(const TaskKey& key, Entry& entry);

    /**
     * Changes the record under its lock, for which it waits five seconds at most. The file's owner stays.
     * @param mayCreate a record that does not exist is made; otherwise it is left missing.
     * @param entry receives what was stored.
     */
    static Result Update(const TaskKey& key, bool mayCreate, const std::function<void(TaskRecord&)>& change,
                         Entry& entry);

    /** Removes the record. False if there was none, or it could not be removed. */
    static bool Remove(const TaskKey& key);

    /** Ids of an owner's records, sorted. Needs the right to list the folder, which only root has. */
    static std::vector<std::string> List(const std::string& owner, const std::string& prefix);

    /** The folder, as a descriptor for paths below it; made first if root asks. Closed if it cannot be used. */
    static UniqueFd OpenFolder();

    /** Path of the record's file. */
    static std::string PathOf(const TaskKey& key);
};

}  // namespace reference
