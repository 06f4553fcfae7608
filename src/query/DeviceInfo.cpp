#include <unistd.h>

#include "base/Log.h"
#include "webapi/APIUtils.h"
#include "zovacore.h"

namespace ZOVA::APIUtils {

namespace {

constexpr const char* kSource = "APIUtils";
constexpr const char* kSwitch = "IF_RUN_AS";

bool TakeEffectiveUser(uid_t user) {
    if (geteuid() == user) {
        return true;
    }
    if (setresuid(static_cast<uid_t>(-1), user, static_cast<uid_t>(-1)) != 0) {
        return false;
    }
    if (user == 0) {
        WEBAPI_LOG_AS(kSource, LOG_AUTH | LOG_INFO, "WARNING: setresuid(-1, 0, -1)");
    }
    return true;
}

bool TakeEffectiveGroup(gid_t group) {
    return getegid() == group || setresgid(static_cast<gid_t>(-1), group, static_cast<gid_t>(-1)) == 0;
}

/** Changes the effective ids only, and only those that differ; root comes first, as the others need it. */
bool RunAs(uid_t user, gid_t group) {
    if (geteuid() == user && getegid() == group) {
        return true;
    }
    return TakeEffectiveUser(0) && TakeEffectiveGroup(group) && TakeEffectiveUser(user);
}

/** Effective root for a scope. */
class [[nodiscard]] EffectiveRootScope {
public:
    EffectiveRootScope() : user(geteuid()), group(getegid()), taken(RunAs(0, 0)) {
        if (!taken) {
            WEBAPI_LOG_AS(kSource, LOG_AUTH | LOG_ERR, "ERROR: %s(%d, %d)", kSwitch, 0, 0);
        }
    }
    EffectiveRootScope(const EffectiveRootScope&) = delete;
    EffectiveRootScope& operator=(const EffectiveRootScope&) = delete;
    ~EffectiveRootScope() {
        if (!RunAs(user, group)) {
            WEBAPI_LOG_AS(kSource, LOG_AUTH | LOG_CRIT, "ERROR: ~%s(%d, %d)", kSwitch, static_cast<int>(user),
                          static_cast<int>(group));
        }
    }

    bool IsTaken() const { return taken; }

private:
    uid_t user;
    gid_t group;
    bool taken;
};

}  // namespace

bool SetZovaInfo(const std::string& key, const std::string& value) {
    const EffectiveRootScope root;
    return root.IsTaken() && QLIBCINFOSetKeyValue(key.c_str(), value.c_str()) >= 0;
}

}  // namespace ZOVA::APIUtils
