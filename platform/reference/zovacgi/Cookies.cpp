#include "zovacgi/Cookies.h"

#include "common/WithoutBlanks.h"

namespace reference {

std::string_view FindCookie(std::string_view header, std::string_view name) {
    std::string_view found;
    while (!header.empty()) {
        const size_t length = header.find(';');
        const std::string_view cookie = WithoutBlanks(header.substr(0, length));
        header.remove_prefix(length == std::string_view::npos ? header.size() : length + 1);
        const size_t equals = cookie.find('=');
        if (equals != std::string_view::npos && cookie.substr(0, equals) == name) {
            found = cookie.substr(equals + 1);
        }
    }
    return found;
}

}  // namespace reference
