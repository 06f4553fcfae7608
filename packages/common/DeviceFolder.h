#pragma once

namespace package {

/** The folder in which the device keeps what only root may read, without a slash at its end. */
const char* DeviceFolder();

}  // namespace package
