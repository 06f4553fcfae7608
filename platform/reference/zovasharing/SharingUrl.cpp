#include "Seam.h"

namespace {

constexpr const char* kPlain = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-._~";
constexpr const char* kFolder = "sharing/";
constexpr int kHighestPort = 65535;
constexpr size_t kLongest = 1024;

bool Has(const std::string& text, const std::string& bytes) {
    return text.size() <= kLongest && text.find_first_not_of(bytes) == std::string::npos;
}

bool IsHost(const std::string& host) {
    if (host.size() > 2 && host.front() == '[' && host.back() == ']') {
        return Has(host.substr(1, host.size() - 2), "0123456789abcdefABCDEF:.");
    }
    return !host.empty() && Has(host, kPlain);
}

/** The folder above the one of the API. */
bool ParentOf(const std::string& path, std::string& parent) {
    if (path.empty()) {
        parent.push_back('/');
        return true;
    }
    if (path.front() != '/' || path.back() != '/' || path.find("//") != std::string::npos ||
        path.find("/./") != std::string::npos || path.find("/../") != std::string::npos ||
        !Has(path, std::string(kPlain) + "/")) {
        return false;
    }
    parent = path.size() == 1 ? path : path.substr(0, path.rfind('/', path.size() - 2) + 1);
    return true;
}

}  // namespace

bool ZOVA::sharing::GetSharingURL(const std::string& host, int port, bool https, const std::string& path,
                                  const std::string& rewriteApp, std::string& url, _tag_SHARING_URL_TYPE& type) {
    url.clear();
    type = SHARING_URL_UNKNOWN;
    std::string parent;
    const bool rewritten = !rewriteApp.empty();
    if (!IsHost(host) || port < 0 || port > kHighestPort || !ParentOf(path, parent) || !Has(rewriteApp, kPlain) ||
        (rewritten && rewriteApp.find_first_not_of('.') == std::string::npos)) {
        return false;
    }
    url.append(https ? "https://" : "http://").append(host);
    if (port != 0 && port != (https ? 443 : 80)) {
        url.append(":").append(std::to_string(port));
    }
    if (rewritten) {
        url.append("/").append(rewriteApp).append("/");
    } else {
        url.append(parent);
    }
    url.append(kFolder);
    type = rewritten ? SHARING_URL_REWRITTEN : SHARING_URL_HOST;
    return true;
}
