#include "webapi/APIValidator.h"

#include <sys/socket.h>

#include <atomic>
#include <memory>
#include <mutex>
#include <new>

#include "request/APIValidatorPrivate.h"
#include "zovacore.h"
#include "zovanetsdk.h"

namespace ZOVA {

namespace {

std::atomic<APIValidator*> instance;
std::mutex creation;

/** What a function that takes a text up to its NUL can judge. */
bool IsWholeText(const std::string& text) {
    return !text.empty() && text.find('\0') == std::string::npos;
}

int AddressType(const std::string& text) {
    return IsWholeText(text) ? ZOVANetGetAddrType(text.c_str()) : 0;
}

}  // namespace

APIValidator::APIValidator(APIValidatorPrivate* patterns) : d(patterns) {}

APIValidator* APIValidator::GetInstance() {
    if (APIValidator* known = instance.load()) {
        return known;
    }
    const std::lock_guard<std::mutex> lock(creation);
    if (instance.load() == nullptr) {
        std::unique_ptr<APIValidatorPrivate> patterns(new (std::nothrow) APIValidatorPrivate());
        APIValidator* made = patterns ? new (std::nothrow) APIValidator(patterns.get()) : nullptr;
        if (made != nullptr) {
            static_cast<void>(patterns.release());
            instance.store(made);
        }
    }
    return instance.load();
}

bool APIValidator::CheckRegex(const std::string& text, const char* pattern) {
    APIValidator* validator = GetInstance();
    return validator != nullptr && validator->d->CheckRegex(text, pattern);
}

bool APIValidator::IsHostname(const std::string& text) {
    return IsWholeText(text) && BlQLIBIsHostname(text.c_str()) != 0;
}

bool APIValidator::IsDomain(const std::string& text) {
    return IsWholeText(text) && BlQLIBIsDomain(text.c_str()) != 0;
}

bool APIValidator::IsIP(const std::string& text) {
    return AddressType(text) != 0;
}

bool APIValidator::IsIPv4(const std::string& text) {
    return AddressType(text) == AF_INET;
}

bool APIValidator::IsIPv6(const std::string& text) {
    return AddressType(text) == AF_INET6;
}

bool APIValidator::IsPort(const int& port) {
    return static_cast<unsigned int>(port) < 65536;
}

// The patterns stand as they are, with what follows from them. A backslash is an ordinary character between brackets,
// so that "+-\" is the range from the plus sign to the backslash.

bool APIValidator::IsEMail(const std::string& text) {
    return !text.empty() &&
           CheckRegex(text, R"re(^[a-zA-Z0-9!#$%&'*+-\/?^_`{|}~\.",()<=>]+@([a-zA-Z0-9_&%!#+-\.]+)$)re");
}

bool APIValidator::IsNetbios(const std::string& text) {
    return !text.empty() && CheckRegex(text, "^[a-zA-Z][_a-zA-Z0-9-]{0,254}$");
}

bool APIValidator::IsWorkGroup(const std::string& text) {
    return !text.empty() && CheckRegex(text, R"re([^][;:"<>*+\/|?,])re");
}

bool APIValidator::IsDigit(const std::string& text) {
    return CheckRegex(text, "^([0-9]+)$");
}

bool APIValidator::IsTetherLinkId(const std::string& text) {
    return CheckRegex(text, "^([a-zA-Z0-9-]+)$");
}

}  // namespace ZOVA
