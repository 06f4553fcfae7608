#pragma once

#include <sys/types.h>

#include <string>

namespace reference {

/**
 * Whether a record of that owner may lie in a file of that user: root's always; an account's records in its own files;
 * the administrators' in those of their members; everyone's in those of any account that the system knows.
 */
bool MayKeepTasks(uid_t user, const std::string& owner);

}  // namespace reference
