#include <cstring>

#include "Seam.h"
#include "zovacgi/Envelope.h"

namespace {

/** Puts the clear text in the place of the longer cipher text. */
bool DecipherInto(char* place, std::string_view cipherText) {
    const size_t room = cipherText.size();
    std::string plain;
    if (!reference::OpenEnvelope(cipherText, plain) || plain.size() > room) {
        return false;
    }
    memcpy(place, plain.c_str(), plain.size() + 1);
    return true;
}

}  // namespace

int ZovaCgiDecryptParam(char* text) {
    return text != nullptr && DecipherInto(text, text) ? 1 : 0;
}

char* ZovaCgiDetectAndDecryptParamLine(char* line) {
    std::string_view cipherText;
    if (line == nullptr) {
        return nullptr;
    }
    if (!reference::IsEncipheredLine(line, cipherText)) {
        return line;
    }
    return DecipherInto(line, cipherText) ? line : nullptr;
}
