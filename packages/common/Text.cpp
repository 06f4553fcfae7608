#include "Text.h"

#include <algorithm>
#include <cstddef>

namespace package {
namespace {

bool IsContinuation(unsigned char byte) {
    return (byte & 0xC0) == 0x80;
}

/** Length of the UTF-8 sequence that begins at `text[at]`, or 0 if none does. */
std::size_t SequenceLength(const std::string& text, std::size_t at) {
    const auto byte = [&](std::size_t offset) -> unsigned char {
        return at + offset < text.size() ? static_cast<unsigned char>(text[at + offset]) : 0;
    };
    const unsigned char first = byte(0);
    if (first < 0x80) {
        return 1;
    }
    std::size_t length = 0;
    unsigned char lowestSecond = 0x80;
    unsigned char highestSecond = 0xBF;
    if (first >= 0xC2 && first <= 0xDF) {
        length = 2;
    } else if (first >= 0xE0 && first <= 0xEF) {
        length = 3;
        lowestSecond = first == 0xE0 ? 0xA0 : 0x80;   // no overlong forms
        highestSecond = first == 0xED ? 0x9F : 0xBF;  // no surrogates
    } else if (first >= 0xF0 && first <= 0xF4) {
        length = 4;
        lowestSecond = first == 0xF0 ? 0x90 : 0x80;
        highestSecond = first == 0xF4 ? 0x8F : 0xBF;  // nothing above U+10FFFF
    } else {
        return 0;
    }
    if (byte(1) < lowestSecond || byte(1) > highestSecond) {
        return 0;
    }
    for (std::size_t offset = 2; offset < length; ++offset) {
        if (!IsContinuation(byte(offset))) {
            return 0;
        }
    }
    return length;
}

}  // namespace

bool HasControlBytes(const std::string& text) {
    return std::any_of(text.begin(), text.end(), [](char c) {
        const auto byte = static_cast<unsigned char>(c);
        return byte < 0x20 || byte == 0x7F;
    });
}

std::string ValidUtf8(const std::string& text) {
    std::string valid;
    valid.reserve(text.size());
    for (std::size_t at = 0; at < text.size();) {
        const std::size_t length = SequenceLength(text, at);
        if (length == 0) {
            valid += "\xEF\xBF\xBD";
            ++at;
        } else {
            valid.append(text, at, length);
            at += length;
        }
    }
    return valid;
}

}  // namespace package
