#include "zovacgi/HeaderValue.h"

#include <algorithm>

#include "common/WithoutBlanks.h"

namespace reference {

namespace {

constexpr size_t kMostParameters = 16;

std::string LowerCase(std::string_view text) {
    std::string lower(text);
    for (char& byte : lower) {
        if (byte >= 'A' && byte <= 'Z') {
            byte = static_cast<char>(byte - 'A' + 'a');
        }
    }
    return lower;
}

void SkipBlanks(std::string_view& text) {
    text.remove_prefix(std::min(text.find_first_not_of(" \t"), text.size()));
}

/** Takes a quoted text, whose opening quote stands in front, off the text. */
bool TakeQuoted(std::string_view& text, std::string& value) {
    for (size_t at = 1; at < text.size(); ++at) {
        if (text[at] == '"') {
            text.remove_prefix(at + 1);
            return true;
        }
        const bool escapes = text[at] == '\\' && at + 1 < text.size() && (text[at + 1] == '"' || text[at + 1] == '\\');
        at += escapes ? 1 : 0;
        value += text[at];
    }
    return false;
}

/** Takes one parameter, behind its semicolon, off the text. */
bool TakeParameter(std::string_view& text, HeaderValue& out) {
    SkipBlanks(text);
    const size_t equals = text.find('=');
    if (equals == std::string_view::npos) {
        return false;
    }
    const std::string name = LowerCase(WithoutBlanks(text.substr(0, equals)));
    if (name.empty() || name.find_first_of(" \t\";") != std::string::npos || out.Find(name) != nullptr) {
        return false;
    }
    text.remove_prefix(equals + 1);
    SkipBlanks(text);
    std::string value;
    if (!text.empty() && text.front() == '"') {
        if (!TakeQuoted(text, value)) {
            return false;
        }
        SkipBlanks(text);
        if (!text.empty() && text.front() != ';') {
            return false;
        }
    } else {
        const size_t end = std::min(text.find(';'), text.size());
        value = WithoutBlanks(text.substr(0, end));
        text.remove_prefix(end);
    }
    out.parameters.emplace_back(name, value);
    return out.parameters.size() <= kMostParameters;
}

}  // namespace

const std::string* HeaderValue::Find(std::string_view name) const {
    for (const auto& parameter : parameters) {
        if (parameter.first == name) {
            return &parameter.second;
        }
    }
    return nullptr;
}

bool ParseHeaderValue(std::string_view text, HeaderValue& out) {
    out = HeaderValue();
    const size_t end = std::min(text.find(';'), text.size());
    out.word = LowerCase(WithoutBlanks(text.substr(0, end)));
    text.remove_prefix(end);
    while (!text.empty()) {
        text.remove_prefix(1);
        if (WithoutBlanks(text).empty()) {
            break;
        }
        if (!TakeParameter(text, out)) {
            return false;
        }
    }
    return !out.word.empty();
}

std::string FormName(std::string_view text) {
    constexpr std::pair<std::string_view, char> kEscapes[] = {
        {"%22", '"'}, {"%0D", '\r'}, {"%0A", '\n'}, {"%0d", '\r'}, {"%0a", '\n'}};
    std::string name;
    while (!text.empty()) {
        const auto* found = std::find_if(std::begin(kEscapes), std::end(kEscapes), [text](const auto& escape) {
            return text.substr(0, escape.first.size()) == escape.first;
        });
        const bool isEscape = found != std::end(kEscapes);
        name += isEscape ? found->second : text.front();
        text.remove_prefix(isEscape ? found->first.size() : 1);
    }
    return name;
}

}  // namespace reference
