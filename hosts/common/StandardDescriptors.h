#pragma once

namespace host {

/**
 * Opens /dev/null on each of the descriptors 0 to 2 that the caller left closed, so that no file opened later takes
 * the place of the client's stream.
 * @return false if one of them could not be opened.
 */
bool OpenStandardDescriptors();

}  // namespace host
