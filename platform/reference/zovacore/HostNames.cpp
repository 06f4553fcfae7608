#include <string_view>

#include "Seam.h"

namespace {

constexpr std::size_t kLongestName = 253;
constexpr std::size_t kLongestLabel = 63;
constexpr const char* kDigits = "0123456789";
constexpr const char* kHexDigits = "0123456789abcdefABCDEF";
constexpr const char* kLabelBytes = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-";

bool ConsistsOf(std::string_view text, const char* bytes) {
    return text.find_first_not_of(bytes) == std::string_view::npos;
}

bool IsLabel(std::string_view label) {
    return !label.empty() && label.size() <= kLongestLabel && label.front() != '-' && label.back() != '-' &&
           ConsistsOf(label, kLabelBytes);
}

/** Resolvers take a name that ends in a number, such as 127.1 or 0x7f000001, for an address. */
bool IsNumber(std::string_view label) {
    return ConsistsOf(label, kDigits) || (label.size() >= 2 && label[0] == '0' && (label[1] | 0x20) == 'x' &&
                                          ConsistsOf(label.substr(2), kHexDigits));
}

/** How many labels the name has; 0 if the text is no name. */
int CountLabels(const char* text) {
    std::string_view rest(text != nullptr ? text : "");
    if (rest.size() > kLongestName) {
        return 0;
    }
    for (int count = 1;; ++count) {
        const std::size_t dot = rest.find('.');
        const std::string_view label = rest.substr(0, dot);
        if (!IsLabel(label)) {
            return 0;
        }
        if (dot == std::string_view::npos) {
            return IsNumber(label) ? 0 : count;
        }
        rest.remove_prefix(dot + 1);
    }
}

}  // namespace

int BlQLIBIsHostname(const char* text) {
    return CountLabels(text) > 0 ? 1 : 0;
}

int BlQLIBIsDomain(const char* text) {
    return CountLabels(text) > 1 ? 1 : 0;
}
