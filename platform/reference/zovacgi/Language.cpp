#include "zovacgi/Language.h"

#include <array>
#include <string>

namespace reference {

namespace {

struct Language {
    char code[4];
    char tag[6];
};

// A tag with a region stands before the one without that would also match.
constexpr Language kLanguages[] = {
    {"enu", "en"},    {"deu", "de"}, {"fra", "fr"}, {"ita", "it"}, {"esn", "es"}, {"cht", "zh-tw"},
    {"cht", "zh-hk"}, {"chs", "zh"}, {"jpn", "ja"}, {"kor", "ko"}, {"nld", "nl"}, {"ptb", "pt-br"},
    {"ptg", "pt"},    {"rus", "ru"}, {"plk", "pl"}, {"sve", "sv"}, {"dan", "da"}, {"nor", "nb"},
    {"nor", "no"},    {"hun", "hu"}, {"trk", "tr"}, {"csy", "cs"}, {"tha", "th"},
};

constexpr size_t kLongestTag = 35;

bool Matches(std::string_view tag, std::string_view range) {
    return tag.substr(0, range.size()) == range && (tag.size() == range.size() || tag[range.size()] == '-');
}

}  // namespace

const char* LanguageByCode(std::string_view code) {
    for (const Language& language : kLanguages) {
        if (code == language.code) {
            return language.code;
        }
    }
    return nullptr;
}

const char* LanguageByHeader(std::string_view header) {
    std::array<char, kLongestTag> lower{};
    const std::string_view tag = header.substr(0, header.find_first_of(",; "));
    if (tag.size() > lower.size()) {
        return nullptr;
    }
    for (size_t at = 0; at < tag.size(); ++at) {
        lower[at] = tag[at] >= 'A' && tag[at] <= 'Z' ? static_cast<char>(tag[at] - 'A' + 'a') : tag[at];
    }
    for (const Language& language : kLanguages) {
        if (Matches(std::string_view(lower.data(), tag.size()), language.tag)) {
            return language.code;
        }
    }
    return nullptr;
}

}  // namespace reference
