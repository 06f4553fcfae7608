#include "dispatcher/HatScope.h"

#include <sys/apparmor.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <initializer_list>

#include "base/ErrnoGuard.h"
#include "base/Log.h"
#include "webapi/Json.h"
#include "zovasdk.h"

namespace ZOVA {

namespace {

constexpr const char* kStackVariable = "APPARMOR_HAT_ARRAY";
constexpr const char* kDefaultHat = "DefaultHat";
constexpr const char* kEmptyHat = "EmptyHat";
constexpr const char* kDefaultSharingHat = "DefaultSharingHat";
constexpr unsigned long kTokenOffset = 0x5a4f5641;

Json::Value StackFromEnvironment() {
    Json::Value stack(Json::arrayValue);
    if (const char* text = getenv(kStackVariable)) {
        Json::Value parsed;
        if (Json::fromString(parsed, text) && parsed.type() == Json::arrayValue) {
            stack.swap(parsed);
        }
    }
    return stack;
}

void StackToEnvironment(const Json::Value& stack) {
    setenv(kStackVariable, Json::toString(stack).c_str(), 1);
}

/** Enters the first of the hats that exists, and gives its name; null if none can be entered. */
const char* EnterFirst(std::initializer_list<const char*> hats, int attempts) {
    for (const char* hat : hats) {
        if (ChangeHat(hat, hatToken, attempts) == 0) {
            return hat;
        }
    }
    return nullptr;
}

}  // namespace

const unsigned long hatToken = static_cast<unsigned long>(getpid()) + kTokenOffset;

int ChangeHat(const char* name, unsigned long token, int attempts) {
    for (int attempt = 1;; ++attempt) {
        const int result = aa_change_hat(name, token);
        if (result == 0 || errno != ECHILD || attempt == attempts) {
            return result;
        }
        sleep(1);
    }
}

HatScope::HatScope(const std::string& api, const std::string& method)
    : restricted(ZOVA_aa_has_profile_restricted() != 0) {
    if (!restricted) {
        return;
    }
    entryStack = StackFromEnvironment();
    Json::Value stack = entryStack;
    const std::string methodHat = api + "." + method;
    const char* entered = EnterFirst({methodHat.c_str(), api.c_str(), kDefaultHat}, attempts);
    if (entered == nullptr) {
        entered = kEmptyHat;
        WEBAPI_LOG(LOG_ERR, "AppArmor: chagehat failed [%m]");
    }
    stack.append(entered);
    StackToEnvironment(stack);
}

HatScope::HatScope(const SharingProject& project)
    : restricted(ZOVA_aa_has_profile_restricted() != 0), attempts(1), entryStack(StackFromEnvironment()) {
    if (!restricted) {
        return;
    }
    const std::string projectHat = "SHARING." + project.name;
    const char* entered = EnterFirst({projectHat.c_str(), kDefaultSharingHat}, attempts);
    if (entered == nullptr) {
        WEBAPI_LOG(LOG_ERR, "AppArmor: chagehat failed [%m]");
        refused = true;
        return;
    }
    Json::Value stack = entryStack;
    stack.append(entered);
    StackToEnvironment(stack);
}

HatScope::~HatScope() {
    base::ErrnoGuard errnoGuard;
    Restore();
}

void HatScope::Restore() {
    if (!restricted) {
        return;
    }
    restricted = false;
    if (entryStack.empty()) {
        if (ChangeHat(nullptr, hatToken, attempts) == -1) {
            WEBAPI_LOG(LOG_ERR, "AppArmor: chagehat Original Hat failed [%m]");
        }
    } else {
        const std::string hat = Json::asString(entryStack[entryStack.size() - 1]);
        if (ChangeHat(hat.c_str(), hatToken, attempts) == -1) {
            WEBAPI_LOG(LOG_ERR, "AppArmor: chagehat [%s] failed [%m]", hat.c_str());
        }
    }
    StackToEnvironment(entryStack);
}

}  // namespace ZOVA
