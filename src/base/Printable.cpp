#include "base/Printable.h"

namespace ZOVA::base {

std::string Printable(const std::string& text) {
    std::string result = text.substr(0, kPrintableLimit);
    for (char& c : result) {
        if (c < 0x20 || c > 0x7e) {
            c = '?';
        }
    }
    return result;
}

}  // namespace ZOVA::base
