#include <syslog.h>

#include <cstring>
#include <ctime>

#include "Paths.h"
#include "Seam.h"
#include "common/Accounts.h"
#include "common/LazyModule.h"
#include "common/NetAddress.h"
#include "common/PrintableText.h"
#include "login/LoginFailures.h"
#include "modules/LoginModule.h"

using reference::LoginFailures;

namespace {

constexpr const char* kService = "zova-webapi";
/** So that a file named after it, in hex, fits into a folder. */
constexpr size_t kLongestName = 120;
constexpr size_t kLongestPassword = 1024;

reference::LazyModule module(reference::paths::kLoginModule);

/** Keeps whoever waits for a refusal from telling its reason by the time it took. */
class RefusalTime {
public:
    RefusalTime() {
        clock_gettime(CLOCK_MONOTONIC, &end);
        end.tv_sec += 1;
    }
    void Wait() const {
        while (clock_nanosleep(CLOCK_MONOTONIC, TIMER_ABSTIME, &end, nullptr) != 0) {
        }
    }

private:
    struct timespec end;
};

bool CanBeUserName(const char* user) {
    const size_t length = strnlen(user, kLongestName + 1);
    if (length == 0 || length > kLongestName || strcmp(user, reference::kSystemUser) == 0) {
        return false;
    }
    for (size_t at = 0; at < length; ++at) {
        const auto byte = static_cast<unsigned char>(user[at]);
        if (byte < 0x20 || byte == 0x7f || byte == '/' || byte == ':') {
            return false;
        }
    }
    return true;
}

int CheckByModule(const char* user, const char* password, const std::string& address) {
    auto* check = module.Find<decltype(ZovaLoginModuleCheck)>("ZovaLoginModuleCheck");
    if (check == nullptr) {
        return ZOVA_LOGIN_MODULE_FAILED;
    }
    const int result = check(reference::paths::kPamDirectory, kService, user, password, address.c_str());
    if (result == ZOVA_LOGIN_MODULE_GOOD) {
        const auto account = reference::FindAccount(user);
        return account && account->uid != 0 ? ZOVA_LOGIN_MODULE_GOOD : ZOVA_LOGIN_MODULE_REFUSED;
    }
    return result;
}

int Refuse(const char* user, const std::string& address, const RefusalTime& time) {
    syslog(LOG_AUTH | LOG_NOTICE, "login of %s from %s refused", reference::PrintableText(user).c_str(),
           address.c_str());
    time.Wait();
    return ZOVA_LOGIN_REFUSED;
}

}  // namespace

int ZovaLoginCheckPassword(const char* user, const char* password, const char* address) {
    if (user == nullptr || password == nullptr) {
        return ZOVA_LOGIN_REFUSED;
    }
    const RefusalTime refusalTime;
    const auto parsed = reference::NetAddress::Parse(address != nullptr ? address : "");
    const std::string client = parsed ? parsed->Text() : "unknown";
    if (!CanBeUserName(user) || strnlen(password, kLongestPassword + 1) > kLongestPassword) {
        return Refuse(user, client, refusalTime);
    }
    const LoginFailures failures(user, parsed ? parsed->SourceKey() : client);
    switch (failures.Charge()) {
        case LoginFailures::Result::kMayTry:
            break;
        case LoginFailures::Result::kBlocked:
            syslog(LOG_AUTH | LOG_WARNING, "login of %s from %s blocked after too many failures",
                   reference::PrintableText(user).c_str(), client.c_str());
            return ZOVA_LOGIN_BLOCKED;
        case LoginFailures::Result::kFailed:
            syslog(LOG_ERR, "login failures cannot be counted");
            return ZOVA_LOGIN_FAILED;
    }
    switch (CheckByModule(user, password, parsed ? client : "")) {
        case ZOVA_LOGIN_MODULE_GOOD:
            return failures.Succeed() ? ZOVA_LOGIN_OK : ZOVA_LOGIN_FAILED;
        case ZOVA_LOGIN_MODULE_REFUSED:
            return Refuse(user, client, refusalTime);
        default:
            syslog(LOG_ERR, "login of %s cannot be checked", reference::PrintableText(user).c_str());
            failures.TakeBack();
            return ZOVA_LOGIN_FAILED;
    }
}
