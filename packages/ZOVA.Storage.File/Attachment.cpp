#include "Attachment.h"

#include "../common/Text.h"

namespace package {
namespace {

bool IsPlain(unsigned char byte) {
    return byte >= 0x20 && byte < 0x7F && byte != '"' && byte != '\\' && byte != '%';
}

/** What may stand in an extended value as it is. */
bool IsUnreserved(unsigned char byte) {
    return (byte >= '0' && byte <= '9') || (byte >= 'A' && byte <= 'Z') || (byte >= 'a' && byte <= 'z') ||
           byte == '-' || byte == '.' || byte == '_' || byte == '~';
}

}  // namespace

std::string AttachmentNamed(const std::string& name) {
    constexpr char kDigits[] = "0123456789ABCDEF";
    std::string plain;
    std::string whole;
    for (const char c : ValidUtf8(name)) {
        const auto byte = static_cast<unsigned char>(c);
        const bool isControl = byte < 0x20 || byte == 0x7F;
        // One for each character: the bytes that go on with one count for nothing.
        if ((byte & 0xC0) != 0x80) {
            plain += IsPlain(byte) ? c : '_';
        }
        if (isControl || IsUnreserved(byte)) {
            whole += isControl ? '_' : c;
        } else {
            whole += {'%', kDigits[byte >> 4], kDigits[byte & 15]};
        }
    }
    return "attachment; filename=\"" + plain + "\"" + (plain == name ? "" : "; filename*=UTF-8''" + whole);
}

}  // namespace package
