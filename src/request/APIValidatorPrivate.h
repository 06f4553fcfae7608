#pragma once

#include <map>
#include <string>

struct re_pattern_buffer;

namespace ZOVA {

/** Longest text that is matched with a pattern, in bytes. */
constexpr std::size_t kLongestMatchedText = 65536;

/** Compiled patterns, each known by the address of its text and not by the text itself. */
class APIValidatorPrivate {
public:
    APIValidatorPrivate() = default;
    APIValidatorPrivate(const APIValidatorPrivate&) = delete;
    APIValidatorPrivate& operator=(const APIValidatorPrivate&) = delete;
    ~APIValidatorPrivate();

    /**
     * Compiles the pattern, or finds it compiled. What `out` receives stays this object's own.
     * @return false if either pointer is null, memory is short, or the pattern is broken; that alone is logged, and
     * nothing is kept.
     */
    bool GetRegex(const char* pattern, re_pattern_buffer** out);

    /** Whether the text matches. A text that holds a NUL, or is longer than the limit, does not. */
    bool CheckRegex(const std::string& text, const char* pattern);

private:
    std::map<const char*, re_pattern_buffer*> compiled;
};

}  // namespace ZOVA
