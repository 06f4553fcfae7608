#pragma once

#include <string>

#include "../common/Descriptor.h"

namespace host {

/**
 * The descriptor that a service manager has handed to this process, as the variables LISTEN_PID and LISTEN_FDS tell;
 * they are taken out of the environment, so that no child takes them for its own.
 * @return a closed one if there is none, or, with the reason in `problem`, if it is not exactly one.
 */
Descriptor TakeHandedOver(std::string& problem);

}  // namespace host
