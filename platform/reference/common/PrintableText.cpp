#include "common/PrintableText.h"

namespace reference {

std::string PrintableText(std::string_view text) {
    constexpr size_t kLongest = 64;
    constexpr char kDigits[] = "0123456789abcdef";
    std::string out;
    for (unsigned char byte : text.substr(0, kLongest)) {
        if (byte == '\\') {
            out += "\\\\";
        } else if (byte >= 0x20 && byte < 0x7f) {
            out += static_cast<char>(byte);
        } else {
            out += "\\x";
            out += kDigits[byte >> 4];
            out += kDigits[byte & 15];
        }
    }
    if (text.size() > kLongest) {
        out += "...";
    }
    return out;
}

}  // namespace reference
