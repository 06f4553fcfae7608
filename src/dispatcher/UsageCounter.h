#pragma once

#include <string>

namespace ZOVA {

/**
 * Adds one call to the counter file of the API's group, under its lock file.
 * @param directory where the counter files lie; created, for root alone, at the first count of the process.
 * @return false if the call could not be counted. Logs nothing.
 */
bool CountUsage(const std::string& directory, const std::string& api, const std::string& method, int version);

}  // namespace ZOVA
