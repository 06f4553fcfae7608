#pragma once

#include <json/value.h>

#include <string>

namespace ZOVA {

/** The token of all hat changes of this process; a forked child inherits it. */
extern const unsigned long hatToken;

constexpr int kHatAttempts = 3;

/**
 * Enters a hat; null leaves the current one. Tries again, `attempts` times in all and a second apart, as long as the
 * kernel answers ECHILD.
 * @return 0 on success.
 */
int ChangeHat(const char* name, unsigned long token, int attempts = kHatAttempts);

/** The project behind a sharing link. */
struct SharingProject {
    std::string name;
};

/**
 * The AppArmor hat of one call, or of a project's check in front of it. The stack of hats stands in the environment
 * variable "APPARMOR_HAT_ARRAY" as a JSON array, innermost last, so that a nested call or a child knows where to go
 * back to. Nothing happens in an unconfined process.
 */
class [[nodiscard]] HatScope {
public:
    /**
     * Enters the hat `<api>.<method>`, else the one named after the API, else "DefaultHat"; where none can be entered
     * the call goes on in the hat where it stands, "EmptyHat" goes on the stack, and a line is logged.
     */
    HatScope(const std::string& api, const std::string& method);
    /**
     * Enters the hat "SHARING.<project>", else "DefaultSharingHat", each tried once. Where none can be entered the
     * check must not run: `IsRefused` tells so, and a line is logged.
     */
    explicit HatScope(const SharingProject& project);
    HatScope(const HatScope&) = delete;
    HatScope& operator=(const HatScope&) = delete;
    ~HatScope();

    bool IsRefused() const { return refused; }

    /** Goes back to the hat and the stack found on entry, once; logs a hat that cannot be left. */
    void Restore();

private:
    bool restricted;
    bool refused = false;
    int attempts = kHatAttempts;
    Json::Value entryStack;
};

}  // namespace ZOVA
