#pragma once

#include <string_view>
#include <vector>

#include "zovaaccesstoken/TokenRecord.h"

namespace reference {

/**
 * The tokens' records, one file each, named by the token's SHA-256, in a folder that only root can enter. The tokens
 * themselves are kept nowhere. A record is made and removed, never changed. Records that cannot be used are logged, and
 * stay until the administrator has looked at them; what has expired goes with the next look through the folder.
 */
class TokenStore {
public:
    enum class Result {
        kGood,
        /** No such token. */
        kUnknown,
        kTooMany,
        /** The folder, the record or the hash cannot be had. */
        kFailed,
    };

    /** Finds the record of a token. A malformed token is unknown, and no file is touched for it. */
    static Result Load(std::string_view token, TokenRecord& record);

    /** Makes the record of a fresh token, unless its user has too many, or all users together have. */
    static Result Add(std::string_view token, const TokenRecord& record);

    /** The records of an account that have not expired, the oldest first. */
    static Result List(std::string_view user, uid_t uid, std::vector<TokenRecord>& records);

    /** Removes the account's record of that id. */
    static Result Remove(std::string_view user, uid_t uid, std::string_view id);
};

}  // namespace reference
