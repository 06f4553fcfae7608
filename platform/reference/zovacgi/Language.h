#pragma once

#include <string_view>

namespace reference {

constexpr const char* kDefaultLanguage = "enu";

/** The interface language of that three-letter code, or null if there is none. */
const char* LanguageByCode(std::string_view code);

/** The interface language for the first tag of an Accept-Language header, or null if there is none. */
const char* LanguageByHeader(std::string_view header);

}  // namespace reference
