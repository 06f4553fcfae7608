#include "httpfileoutputer/MimeTypes.h"

#include <strings.h>

#include <algorithm>

#include "Paths.h"
#include "common/Files.h"

namespace reference {

namespace {

constexpr std::string_view kBlanks = " \t\r";

/** Takes the first word from the front of a line; empty at its end. */
std::string_view TakeWord(std::string_view& line) {
    const size_t begin = std::min(line.find_first_not_of(kBlanks), line.size());
    const size_t end = std::min(line.find_first_of(kBlanks, begin), line.size());
    const std::string_view word = line.substr(begin, end - begin);
    line.remove_prefix(end);
    return word;
}

bool IsSame(std::string_view one, std::string_view other) {
    return one.size() == other.size() && strncasecmp(one.data(), other.data(), one.size()) == 0;
}

bool IsType(std::string_view word) {
    const size_t slash = word.find('/');
    return slash != std::string_view::npos && slash > 0 && slash + 1 < word.size() &&
           std::all_of(word.begin(), word.end(), [](char byte) { return byte > 0x20 && byte < 0x7f; });
}

/** Behind the last point of the name's last part; empty for ".profile", which is all name. */
std::string_view ExtensionOf(std::string_view fileName) {
    const std::string_view name = fileName.substr(fileName.rfind('/') + 1);
    const size_t point = name.rfind('.');
    return point == std::string_view::npos || point == 0 ? std::string_view() : name.substr(point + 1);
}

}  // namespace

std::string_view FindMimeType(std::string_view table, std::string_view extension) {
    while (!table.empty()) {
        const size_t end = std::min(table.find('\n'), table.size());
        std::string_view line = table.substr(0, end);
        table.remove_prefix(std::min(end + 1, table.size()));
        line = line.substr(0, line.find('#'));
        const std::string_view type = TakeWord(line);
        if (!IsType(type)) {
            continue;
        }
        for (std::string_view word = TakeWord(line); !word.empty(); word = TakeWord(line)) {
            if (IsSame(word, extension)) {
                return type;
            }
        }
    }
    return {};
}

std::string MimeTypeOf(std::string_view fileName) {
    constexpr size_t kLargestTable = size_t{1} << 20;
    const std::string_view extension = ExtensionOf(fileName);
    std::string table;
    if (extension.empty() || ReadFile(paths::kMimeTypes, kLargestTable, FileTrust::kAny, table) != ReadResult::kGood) {
        return kUnknownMimeType;
    }
    const std::string_view type = FindMimeType(table, extension);
    return type.empty() ? kUnknownMimeType : std::string(type);
}

}  // namespace reference
