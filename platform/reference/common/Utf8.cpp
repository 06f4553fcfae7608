#include "common/Utf8.h"

namespace reference {

namespace {

/** First bytes of one form, its length, and what its second byte may be. Every byte behind that is 0x80 to 0xbf. */
struct Form {
    unsigned char firstFrom;
    unsigned char firstTo;
    size_t length;
    unsigned char secondFrom;
    unsigned char secondTo;
};

/** Neither longer than needed, nor a surrogate, nor above U+10FFFF. */
constexpr Form kForms[] = {
    {0x00, 0x7f, 1, 0, 0},       {0xc2, 0xdf, 2, 0x80, 0xbf}, {0xe0, 0xe0, 3, 0xa0, 0xbf},
    {0xe1, 0xec, 3, 0x80, 0xbf}, {0xed, 0xed, 3, 0x80, 0x9f}, {0xee, 0xef, 3, 0x80, 0xbf},
    {0xf0, 0xf0, 4, 0x90, 0xbf}, {0xf1, 0xf3, 4, 0x80, 0xbf}, {0xf4, 0xf4, 4, 0x80, 0x8f},
};

bool Fits(std::string_view text, const Form& form) {
    const auto byte = [&](size_t place) { return static_cast<unsigned char>(text[place]); };
    if (text.size() < form.length || byte(0) < form.firstFrom || byte(0) > form.firstTo) {
        return false;
    }
    if (form.length > 1 && (byte(1) < form.secondFrom || byte(1) > form.secondTo)) {
        return false;
    }
    for (size_t place = 2; place < form.length; ++place) {
        if (byte(place) < 0x80 || byte(place) > 0xbf) {
            return false;
        }
    }
    return true;
}

}  // namespace

size_t Utf8CharacterLength(std::string_view text) {
    for (const Form& form : kForms) {
        if (Fits(text, form)) {
            return form.length;
        }
    }
    return 0;
}

bool IsUtf8(std::string_view text) {
    while (!text.empty()) {
        const size_t length = Utf8CharacterLength(text);
        if (length == 0) {
            return false;
        }
        text.remove_prefix(length);
    }
    return true;
}

}  // namespace reference
