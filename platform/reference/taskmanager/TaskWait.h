#pragma once

#include <string>

#include "taskmanager/TaskStore.h"

namespace reference {

/**
 * Waits until the record has the property, at most that many seconds. What wakes it is the replacement of the record's
 * file, or the end of the task's process.
 * @return whether the property is there. False at once if there is no record, or its process has ended without having
 *     finished the task; a task that was finished without the property is waited for up to the time limit.
 */
bool WaitForTaskProperty(const TaskKey& key, const std::string& name, int seconds);

}  // namespace reference
