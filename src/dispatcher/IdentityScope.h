#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace ZOVA {

/**
 * Leaves the process running as `user`, with the way back open if `keep` is true and closed for good otherwise. Logs
 * every gain of root, and every refused one, in the facility LOG_AUTH.
 * @return true if the identity was taken as a whole.
 */
bool ResetIdentity(const std::string& user, bool keep);

/** Identity of the process: user ids, group ids and supplementary groups. */
class [[nodiscard]] IdentityScope {
public:
    IdentityScope() = default;
    IdentityScope(const IdentityScope&) = delete;
    IdentityScope& operator=(const IdentityScope&) = delete;

    /** Notes the current identity; false if it cannot be read. */
    bool Save();

    /** Effective root, real and saved ids untouched. False with a line in the log if refused. */
    bool BecomeEffectiveRoot();

    /**
     * Goes back to the noted identity, in the order in which rights are regained: group, user, supplementary groups,
     * then the noted ids. Logs each gain of root and each refusal; never fails the call.
     */
    void Restore();

    /**
     * The same for an identity whose ids are still at hand as real or saved ones: regains nothing first, and touches
     * the supplementary groups only if they have changed.
     */
    void RestoreKept();

private:
    /** Sets the noted ids, group first. */
    void RestoreIds();

    uid_t realUser = 0;
    uid_t effectiveUser = 0;
    uid_t savedUser = 0;
    gid_t realGroup = 0;
    gid_t effectiveGroup = 0;
    gid_t savedGroup = 0;
    std::vector<gid_t> groups;
};

}  // namespace ZOVA
