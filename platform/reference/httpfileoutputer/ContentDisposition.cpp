#include "httpfileoutputer/ContentDisposition.h"

#include "common/Utf8.h"
#include "httpfileoutputer/PercentText.h"

namespace reference {

namespace {

/** Longest name that a file can have. */
constexpr size_t kLongestName = 255;

struct Names {
    std::string plain;
    std::string utf8;
};

Names NamesOf(std::string_view name) {
    Names names;
    while (!name.empty()) {
        const size_t length = Utf8CharacterLength(name);
        const auto first = static_cast<unsigned char>(name.front());
        if (length == 0 || first < 0x20 || first == 0x7f || first == '\\') {
            names.plain += '_';
            names.utf8 += '_';
        } else {
            names.plain += length == 1 && first != '"' ? static_cast<char>(first) : '_';
            names.utf8 += name.substr(0, length);
        }
        name.remove_prefix(length == 0 ? 1 : length);
    }
    return names;
}

}  // namespace

std::string AttachmentNamed(std::string_view path) {
    const std::string_view name = path.substr(path.rfind('/') + 1).substr(0, kLongestName);
    if (name.empty() || name == "." || name == "..") {
        return "";
    }
    const Names names = NamesOf(name);
    std::string value = "attachment; filename=\"" + names.plain + "\"";
    // Some clients decode "%41" in a plain name, so that the second form says what is meant.
    if (names.plain != names.utf8 || names.plain.find('%') != std::string::npos) {
        value += "; filename*=UTF-8''" + PercentText(names.utf8, "");
    }
    return value;
}

}  // namespace reference
