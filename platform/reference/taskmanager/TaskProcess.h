#pragma once

#include <sys/types.h>

#include <cstdint>

namespace reference {

/** When the process started, in clock ticks since boot; 0 if it is gone, a zombie, or /proc does not show it. */
std::uint64_t ProcessStart(int pid);

/** Whether this very process still runs. */
bool IsProcessRunning(int pid, std::uint64_t start);

/** Whether one of the process's real, effective and saved user ids is that user. */
bool HasProcessUser(int pid, uid_t user);

/** A descriptor that becomes readable when the process ends; -1 if it is gone or the kernel gives none. */
int OpenProcess(int pid);

}  // namespace reference
