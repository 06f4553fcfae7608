#include "webapi/UrlText.h"

namespace reference {

namespace {

int HexValue(char digit) {
    if (digit >= '0' && digit <= '9') {
        return digit - '0';
    }
    if (digit >= 'a' && digit <= 'f') {
        return digit - 'a' + 10;
    }
    return digit >= 'A' && digit <= 'F' ? digit - 'A' + 10 : -1;
}

bool IsUnreserved(char byte) {
    return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || (byte >= '0' && byte <= '9') ||
           byte == '-' || byte == '_' || byte == '.' || byte == '~';
}

}  // namespace

std::string PercentDecode(std::string_view text, bool plusIsBlank) {
    std::string out;
    out.reserve(text.size());
    for (size_t at = 0; at < text.size(); ++at) {
        if (text[at] == '+' && plusIsBlank) {
            out += ' ';
            continue;
        }
        if (text[at] == '%' && text.size() - at > 2) {
            const int high = HexValue(text[at + 1]);
            const int low = HexValue(text[at + 2]);
            if (high >= 0 && low >= 0) {
                out += static_cast<char>(high << 4 | low);
                at += 2;
                continue;
            }
        }
        out += text[at];
    }
    return out;
}

std::string PercentEncode(std::string_view text) {
    constexpr char kDigits[] = "0123456789ABCDEF";
    std::string out;
    out.reserve(text.size());
    for (char byte : text) {
        if (IsUnreserved(byte)) {
            out += byte;
        } else {
            const auto value = static_cast<unsigned char>(byte);
            out += '%';
            out += kDigits[value >> 4];
            out += kDigits[value & 15];
        }
    }
    return out;
}

}  // namespace reference
