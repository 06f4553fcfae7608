#pragma once

#include <sys/stat.h>

#include <ctime>
#include <string>
#include <string_view>

namespace reference {

/** What tells one state of a file from another. */
struct Validators {
    /** With its quotes; strong. */
    std::string tag;
    /** Seconds since the epoch. */
    time_t modified = 0;
    /** Whether `modified` names one state only: a file changed just now may change again within the same second. */
    bool isSettled = false;
};

/** Made of number, size and time of change in nanoseconds. */
Validators ValidatorsOf(const struct stat& status, time_t now);

/** Values of a request's conditional headers; empty for those that are not there. */
struct Conditions {
    std::string_view match;
    std::string_view noneMatch;
    std::string_view modifiedSince;
    std::string_view unmodifiedSince;
    std::string_view ifRange;

    bool AreNone() const {
        return match.empty() && noneMatch.empty() && modifiedSince.empty() && unmodifiedSince.empty() &&
               ifRange.empty();
    }
};

enum class Verdict {
    /** As if there were no condition. */
    kSend,
    /** 304: the client has it. */
    kNotModified,
    /** 412: it is not what the client means. */
    kFailed,
};

/**
 * Judges a GET or HEAD: If-Match before If-Unmodified-Since, then If-None-Match before If-Modified-Since; the second of
 * each pair counts only where the first is not there. A date that is none is passed over, a list of tags that is none
 * holds no tag.
 */
Verdict Judge(const Conditions& conditions, const Validators& file, time_t now);

/** Whether a range may be sent. Without If-Range it may; a weak tag, or a date that is not exactly the file's, forbids.
 */
bool AllowsRange(const Conditions& conditions, const Validators& file, time_t now);

}  // namespace reference
