#include "common/Base64.h"

#include <cstdint>

namespace reference {

namespace {

int DigitValue(char digit, bool url) {
    if (digit >= 'A' && digit <= 'Z') {
        return digit - 'A';
    }
    if (digit >= 'a' && digit <= 'z') {
        return digit - 'a' + 26;
    }
    if (digit >= '0' && digit <= '9') {
        return digit - '0' + 52;
    }
    if (digit == (url ? '-' : '+')) {
        return 62;
    }
    return digit == (url ? '_' : '/') ? 63 : -1;
}

}  // namespace

std::string Base64Encode(std::string_view bytes) {
    constexpr char kDigits[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string out;
    out.reserve((bytes.size() + 2) / 3 * 4);
    for (size_t at = 0; at < bytes.size(); at += 3) {
        const size_t count = bytes.size() - at < 3 ? bytes.size() - at : 3;
        uint32_t group = 0;
        for (size_t i = 0; i < 3; ++i) {
            group = group << 8 | (i < count ? static_cast<unsigned char>(bytes[at + i]) : 0);
        }
        out += kDigits[group >> 18];
        out += kDigits[group >> 12 & 63];
        out += count > 1 ? kDigits[group >> 6 & 63] : '=';
        out += count > 2 ? kDigits[group & 63] : '=';
    }
    return out;
}

bool Base64Decode(std::string_view text, Base64Alphabet alphabet, std::string& bytes) {
    bool url = true;
    if (alphabet == Base64Alphabet::kAny) {
        url = text.find_first_of("+/") == std::string_view::npos;
        if (text.size() % 4 == 0) {
            for (int i = 0; i < 2 && !text.empty() && text.back() == '='; ++i) {
                text.remove_suffix(1);
            }
        }
    }
    bytes.clear();
    bytes.reserve(text.size() / 4 * 3 + 2);
    uint32_t bits = 0;
    int count = 0;
    for (char digit : text) {
        const int value = DigitValue(digit, url);
        if (value < 0) {
            return false;
        }
        bits = bits << 6 | static_cast<uint32_t>(value);
        count += 6;
        if (count >= 8) {
            count -= 8;
            bytes += static_cast<char>(bits >> count & 0xff);
        }
    }
    return count < 6 && (bits & ((1u << count) - 1)) == 0;
}

}  // namespace reference
