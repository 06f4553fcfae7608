#pragma once

#include <string_view>

namespace reference {

/** Whether the text holds a byte below 0x20, NUL among them, or 0x7f. */
inline bool HasControlByte(std::string_view text) {
    for (const unsigned char byte : text) {
        if (byte < 0x20 || byte == 0x7f) {
            return true;
        }
    }
    return false;
}

}  // namespace reference
