// libcurl on the fake platform: what its loader finds in the place of the real one.

#include "FakeHttp.h"

#include <curl/curl.h>

#include <cerrno>
#include <csignal>
#include <cstdarg>
#include <cstdlib>
#include <cstring>

#include "FakePlatform.h"

using fake::FakePlatform;

namespace {

using Callback = std::size_t (*)(char*, std::size_t, std::size_t, void*);

struct Transfer {
    fake::HttpRequest request;
    const char* fields = nullptr;
    long long fieldsSize = -1;
    Callback writeBody = nullptr;
    void* bodyData = nullptr;
    Callback writeHeader = nullptr;
    void* headerData = nullptr;
};

Transfer& Of(CURL* handle) {
    return *static_cast<Transfer*>(handle);
}

CURL* Init() {
    FakePlatform& platform = FakePlatform::Required("curl_easy_init");
    if (!platform.Enter("curl_easy_init", "", ENOMEM)) {
        return nullptr;
    }
    ++platform.curlObjects;
    return new Transfer;
}

void Cleanup(CURL* handle) {
    FakePlatform& platform = FakePlatform::Required("curl_easy_cleanup");
    platform.Enter("curl_easy_cleanup", "", 0);
    --platform.curlObjects;
    delete &Of(handle);
}

std::vector<std::string> Lines(const curl_slist* list) {
    std::vector<std::string> lines;
    for (; list != nullptr; list = list->next) {
        lines.emplace_back(list->data);
    }
    return lines;
}

CURLcode SetOption(CURL* handle, CURLoption option, ...) {
    Transfer& transfer = Of(handle);
    std::map<std::string, std::string>& options = transfer.request.options;
    va_list arguments;
    va_start(arguments, option);
    const auto number = [&] { return std::to_string(va_arg(arguments, long)); };
    const auto text = [&] { return std::string(va_arg(arguments, const char*)); };
    const char* name = nullptr;
    switch (option) {
        case CURLOPT_URL:
            options[name = "URL"] = text();
            break;
        case CURLOPT_SSL_VERIFYHOST:
            options[name = "SSL_VERIFYHOST"] = number();
            break;
        case CURLOPT_SSL_VERIFYPEER:
            options[name = "SSL_VERIFYPEER"] = number();
            break;
        case CURLOPT_TIMEOUT:
            options[name = "TIMEOUT"] = number();
            break;
        case CURLOPT_PROXY:
            options[name = "PROXY"] = text();
            break;
        case CURLOPT_FOLLOWLOCATION:
            options[name = "FOLLOWLOCATION"] = number();
            break;
        case CURLOPT_PROTOCOLS_STR:
            options[name = "PROTOCOLS_STR"] = text();
            break;
        case CURLOPT_NOSIGNAL:
            options[name = "NOSIGNAL"] = number();
            break;
        case CURLOPT_POSTFIELDS:
            name = "POSTFIELDS";
            transfer.fields = va_arg(arguments, const char*);
            break;
        case CURLOPT_POSTFIELDSIZE_LARGE:
            name = "POSTFIELDSIZE_LARGE";
            transfer.fieldsSize = va_arg(arguments, curl_off_t);
            break;
        case CURLOPT_WRITEFUNCTION:
            name = "WRITEFUNCTION";
            transfer.writeBody = va_arg(arguments, Callback);
            break;
        case CURLOPT_WRITEDATA:
            name = "WRITEDATA";
            transfer.bodyData = va_arg(arguments, void*);
            break;
        case CURLOPT_HEADERFUNCTION:
            name = "HEADERFUNCTION";
            transfer.writeHeader = va_arg(arguments, Callback);
            break;
        case CURLOPT_HEADERDATA:
            name = "HEADERDATA";
            transfer.headerData = va_arg(arguments, void*);
            break;
        case CURLOPT_HTTPHEADER:
            name = "HTTPHEADER";
            transfer.request.headers = Lines(va_arg(arguments, curl_slist*));
            break;
        default:
            fake::Unmodelled("curl option " + std::to_string(option));
    }
    va_end(arguments);
    return FakePlatform::Required("curl_easy_setopt").Enter("curl_easy_setopt", name, EINVAL) ? CURLE_OK
                                                                                              : CURLE_UNKNOWN_OPTION;
}

/** False as soon as the receiver takes less than it was given. */
bool Deliver(const std::vector<std::string>& pieces, Callback write, void* data) {
    for (std::string piece : pieces) {
        if (write(piece.data(), 1, piece.size(), data) != piece.size()) {
            return false;
        }
    }
    return true;
}

/** Whether a peer that closes its end would end this process. */
bool DiesOfBrokenPipes() {
    struct sigaction now {};
    sigaction(SIGPIPE, nullptr, &now);
    return now.sa_handler != SIG_IGN;
}

CURLcode Perform(CURL* handle) {
    FakePlatform& platform = FakePlatform::Required("curl_easy_perform");
    Transfer& transfer = Of(handle);
    fake::HttpRequest& request = transfer.request;
    request.options["POSTFIELDS"] = transfer.fieldsSize < 0
                                        ? std::string(transfer.fields)
                                        : std::string(transfer.fields, static_cast<std::size_t>(transfer.fieldsSize));
    platform.httpRequests.push_back(request);
    const std::string danger = DiesOfBrokenPipes() ? ", dies of broken pipes" : "";
    if (!platform.Enter("curl_easy_perform", request.options["URL"] + danger, ECONNREFUSED)) {
        return CURLE_COULDNT_CONNECT;
    }
    const auto server = platform.httpServers.find(request.options["URL"]);
    if (server == platform.httpServers.end()) {
        return CURLE_COULDNT_CONNECT;
    }
    const fake::HttpAnswer answer = server->second;
    const bool taken = Deliver(answer.headers, transfer.writeHeader, transfer.headerData) &&
                       Deliver(answer.body, transfer.writeBody, transfer.bodyData);
    return taken ? CURLE_OK : CURLE_WRITE_ERROR;
}

curl_slist* Append(curl_slist* list, const char* line) {
    FakePlatform& platform = FakePlatform::Required("curl_slist_append");
    if (!platform.Enter("curl_slist_append", line, ENOMEM)) {
        return nullptr;
    }
    ++platform.curlObjects;
    auto* added = new curl_slist{strdup(line), nullptr};
    curl_slist** end = &list;
    while (*end != nullptr) {
        end = &(*end)->next;
    }
    *end = added;
    return list;
}

void FreeAll(curl_slist* list) {
    while (list != nullptr) {
        --FakePlatform::Required("curl_slist_free_all").curlObjects;
        curl_slist* next = list->next;
        free(list->data);
        delete list;
        list = next;
    }
}

}  // namespace

namespace fake {

void* CurlHandle() {
    static int place;
    return &place;
}

void* CurlFunction(const char* name) {
    static const std::map<std::string, void*> functions = {
        {"curl_easy_init", reinterpret_cast<void*>(&Init)},
        {"curl_easy_setopt", reinterpret_cast<void*>(&SetOption)},
        {"curl_easy_perform", reinterpret_cast<void*>(&Perform)},
        {"curl_easy_cleanup", reinterpret_cast<void*>(&Cleanup)},
        {"curl_slist_append", reinterpret_cast<void*>(&Append)},
        {"curl_slist_free_all", reinterpret_cast<void*>(&FreeAll)},
    };
    const auto function = functions.find(name);
    return function == functions.end() ? nullptr : function->second;
}

}  // namespace fake
