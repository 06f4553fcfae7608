#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace reference {

/** Attempts of one account or from one address. Times are seconds since the machine's start. */
struct FailureCount {
    int attempts = 0;
    int64_t since = 0;
    int64_t blockedUntil = 0;

    bool IsBlocked(int64_t now) const { return blockedUntil > now; }
    /** Counts an attempt; the one that reaches the limit is still let through, and blocks those after it. */
    void Charge(int64_t now);
    /** Takes one attempt back. */
    void Refund();

    std::string Text() const;
    /** A text of another form counts as no attempts. */
    static FailureCount Parse(const std::string& text);
};

constexpr int kFailureLimit = 5;
constexpr int64_t kFailureWindow = 600;
constexpr int64_t kBlockTime = 600;

/**
 * The attempts to log in, for each account and for each address. An attempt is counted before the password is looked
 * at, so that many at once get no more tries than one after the other, and taken back if it succeeds.
 */
class LoginFailures {
public:
    enum class Result { kMayTry, kBlocked, kFailed };

    /** @param source key of the client's address, of letters and digits. */
    LoginFailures(std::string_view user, std::string_view source);

    Result Charge() const;
    /** After a success: forgets the account's attempts and takes this one of the address back. */
    bool Succeed() const;
    /** After a check that could not be made: takes the attempt back on both sides. */
    bool TakeBack() const;

private:
    std::string accountFile;
    std::string sourceFile;
};

}  // namespace reference
