#pragma once

namespace reference {

/**
 * Housekeeping, for root alone and at most once in 30 seconds: deletes the files of records that have expired, of those
 * of tasks whose process died a day ago, and whatever else was left in the folder that long.
 */
void SweepTasks();

}  // namespace reference
