#pragma once

#include <string>
#include <string_view>

namespace reference {

enum class Base64Alphabet {
    /** "-" and "_", no padding. */
    kUrl,
    /** Either alphabet (not mixed), padding optional. */
    kAny,
};

/** Standard alphabet with padding. */
std::string Base64Encode(std::string_view bytes);

/**
 * Decodes the whole text: no blanks, no bits left over, full padding or none.
 * @return false for anything else; `bytes` is then unspecified.
 */
bool Base64Decode(std::string_view text, Base64Alphabet alphabet, std::string& bytes);

}  // namespace reference
