#include "ClientPath.h"

#include "../common/Text.h"

namespace package {
namespace {

bool IsPart(const std::string& part) {
    return !part.empty() && part.size() <= kLongestName && part != "." && part != "..";
}

}  // namespace

bool IsClientPath(const std::string& text) {
    if (text == kTopPath) {
        return true;
    }
    if (text.empty() || text.size() > kLongestPath || text.front() != '/' || text.find('\0') != std::string::npos) {
        return false;
    }
    for (std::size_t at = 1;;) {
        const std::size_t end = text.find('/', at);
        if (!IsPart(text.substr(at, end - at))) {
            return false;
        }
        if (end == std::string::npos) {
            return true;
        }
        at = end + 1;
    }
}

bool IsNewName(const std::string& name) {
    return IsPart(name) && name.find('/') == std::string::npos && !HasControlBytes(name) && ValidUtf8(name) == name;
}

std::string NameOf(const std::string& path) {
    return path.substr(path.rfind('/') + 1);
}

std::string Join(const std::string& folder, const std::string& name) {
    return folder == kTopPath ? folder + name : folder + "/" + name;
}

bool IsWithin(const std::string& path, const std::string& folder) {
    return path == folder || path.compare(0, folder.size() + 1, folder + "/") == 0;
}

}  // namespace package
