#include "Seam.h"

void QLIBCStrCaseLower(char* text, int, int, std::size_t size) {
    if (text == nullptr) {
        return;
    }
    for (std::size_t at = 0; at < size && text[at] != '\0'; ++at) {
        if (text[at] >= 'A' && text[at] <= 'Z') {
            text[at] = static_cast<char>(text[at] - 'A' + 'a');
        }
    }
}
