#include "httpfileoutputer/PercentText.h"

namespace reference {

namespace {

bool IsUnreserved(char byte) {
    return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || (byte >= '0' && byte <= '9') ||
           byte == '-' || byte == '.' || byte == '_' || byte == '~';
}

}  // namespace

std::string PercentText(std::string_view text, std::string_view kept) {
    constexpr char kDigits[] = "0123456789ABCDEF";
    std::string out;
    for (char byte : text) {
        if (IsUnreserved(byte) || kept.find(byte) != std::string_view::npos) {
            out += byte;
        } else {
            const auto code = static_cast<unsigned char>(byte);
            out += '%';
            out += kDigits[code >> 4];
            out += kDigits[code & 15];
        }
    }
    return out;
}

}  // namespace reference
