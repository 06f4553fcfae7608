#pragma once

#include <json/value.h>

#include <string>

namespace ZOVA {

/** The token of all hat changes of this process; a forked child inherits it. */
extern const unsigned long hatToken;

/**
 * Enters a hat; null leaves the current one. Tries again, three times in all and a second apart, as long as the
 * kernel answers ECHILD.
 * @return 0 on success.
 */
int ChangeHat(const char* name, unsigned long token);

/**
 * The AppArmor hat of one call. The stack of hats stands in the environment variable "APPARMOR_HAT_ARRAY" as a JSON
 * array, innermost last, so that a nested call or a child knows where to go back to. Nothing happens in an unconfined
 * process.
 */
class [[nodiscard]] HatScope {
public:
    /**
     * Enters the hat `<api>.<method>`, else the one named after the API, else "DefaultHat"; where none can be entered
     * the call goes on in the hat where it stands, "EmptyHat" goes on the stack, and a line is logged.
     */
    HatScope(const std::string& api, const std::string& method);
    HatScope(const HatScope&) = delete;
    HatScope& operator=(const HatScope&) = delete;
    ~HatScope();

    /** Goes back to the hat and the stack found on entry, once; logs a hat that cannot be left. */
    void Restore();

private:
    bool restricted;
    Json::Value entryStack;
};

}  // namespace ZOVA
