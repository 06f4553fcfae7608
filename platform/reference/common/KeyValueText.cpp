#include "common/KeyValueText.h"

#include "common/WithoutBlanks.h"

namespace reference {

namespace {

std::optional<std::string_view> ValueOfLine(std::string_view line, std::string_view key) {
    if (!line.empty() && line.back() == '\r') {
        line.remove_suffix(1);
    }
    line = WithoutBlanks(line);
    if (line.substr(0, key.size()) != key || line.size() < key.size() + 3 || line[key.size()] != '=') {
        return std::nullopt;
    }
    line.remove_prefix(key.size() + 1);
    if (line.front() != '"' || line.back() != '"') {
        return std::nullopt;
    }
    line = line.substr(1, line.size() - 2);
    return line.find('"') == std::string_view::npos ? std::optional(line) : std::nullopt;
}

}  // namespace

std::optional<std::string_view> FindKeyValue(std::string_view text, std::string_view key) {
    std::optional<std::string_view> found;
    if (key.empty() || key.front() == '#') {
        return found;
    }
    while (!text.empty()) {
        const size_t length = text.find('\n');
        if (const auto value = ValueOfLine(text.substr(0, length), key)) {
            found = value;
        }
        text.remove_prefix(length == std::string_view::npos ? text.size() : length + 1);
    }
    return found;
}

std::string WithKeyValue(std::string_view text, std::string_view key, std::string_view value) {
    std::string changed(text);
    if (const auto old = FindKeyValue(text, key)) {
        return changed.replace(static_cast<size_t>(old->data() - text.data()), old->size(), value);
    }
    if (!changed.empty() && changed.back() != '\n') {
        changed += '\n';
    }
    return changed.append(key).append("=\"").append(value).append("\"\n");
}

}  // namespace reference
