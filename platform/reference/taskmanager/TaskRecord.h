#pragma once

#include <json/value.h>

#include <cstdint>
#include <string>
#include <string_view>

#include "taskmanager/TaskKey.h"

namespace reference {

/** Longest text of a record. */
constexpr size_t kLargestTaskRecord = 8 << 20;

/** How long the record of a finished task that is to be removed can still be read, in seconds. */
constexpr std::uint64_t kTaskKeptSeconds = 60;

/** What a task's file holds beside the key. */
struct TaskRecord {
    /** 0: none yet. */
    int pid = 0;
    /** When that process started, in clock ticks since boot: a later process of the same id is another one. */
    std::uint64_t processStart = 0;
    bool finished = false;
    /** Of a finished task: the record is to be removed. */
    bool removed = false;
    /** When that was settled, in seconds since boot. */
    std::uint64_t removedAt = 0;
    Json::Value properties = Json::Value(Json::objectValue);

    /** Whether the record has outlived its task long enough. A time to come is one of an earlier boot. */
    bool IsExpired(std::uint64_t now) const;
};

/**
 * Reads a record's text; docs/background-tasks.md describes it. A pure function of its arguments.
 * @return false for anything that is no record of that key, also for one with a member too many; `record` is then left
 *     alone.
 */
bool ParseTaskRecord(std::string_view text, const TaskKey& key, TaskRecord& record);

std::string WriteTaskRecord(const TaskKey& key, const TaskRecord& record);

/** Seconds since boot, time asleep included. */
std::uint64_t SecondsSinceBoot();

}  // namespace reference
