#include "request/APIValidatorPrivate.h"

#include <regex.h>

#include <memory>

#include "base/FreeDeleter.h"
#include "base/Log.h"

namespace ZOVA {

APIValidatorPrivate::~APIValidatorPrivate() {
    for (const auto& [pattern, expression] : compiled) {
        regfree(expression);
        free(expression);
    }
}

bool APIValidatorPrivate::GetRegex(const char* pattern, re_pattern_buffer** out) {
    if (pattern == nullptr || out == nullptr) {
        return false;
    }
    const auto known = compiled.find(pattern);
    if (known != compiled.end()) {
        *out = known->second;
        return true;
    }
    std::unique_ptr<regex_t, base::FreeDeleter> expression(static_cast<regex_t*>(calloc(1, sizeof(regex_t))));
    if (!expression) {
        return false;
    }
    if (regcomp(expression.get(), pattern, REG_EXTENDED | REG_NOSUB) != 0) {
        WEBAPI_LOG(LOG_ERR, "Invalid pattern");
        return false;
    }
    compiled.emplace(pattern, expression.get());
    *out = expression.release();
    return true;
}

bool APIValidatorPrivate::CheckRegex(const std::string& text, const char* pattern) {
    re_pattern_buffer* expression = nullptr;
    return GetRegex(pattern, &expression) && text.size() <= kLongestMatchedText &&
           text.find('\0') == std::string::npos && regexec(expression, text.c_str(), 0, nullptr, 0) == 0;
}

}  // namespace ZOVA
