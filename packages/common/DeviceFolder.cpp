#include "DeviceFolder.h"

namespace package {

const char* DeviceFolder() {
    return "/etc/zova";
}

}  // namespace package
