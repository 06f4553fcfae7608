#pragma once

#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace reference {

/** The value of a header line of the form: word; name=word; name="quoted text". */
struct HeaderValue {
    /** In lower case. */
    std::string word;
    /** Names in lower case, each once. */
    std::vector<std::pair<std::string, std::string>> parameters;

    /** Null if there is none. */
    const std::string* Find(std::string_view name) const;
};

/**
 * Parses such a value; inside quotes a backslash stands for itself unless a quote or another backslash follows.
 * @return false for another form, a parameter that comes twice, or more than sixteen.
 */
bool ParseHeaderValue(std::string_view text, HeaderValue& out);

/** Turns what browsers write for a quote and for line ends in a name of a form, %22, %0D and %0A, back into these. */
std::string FormName(std::string_view text);

}  // namespace reference
