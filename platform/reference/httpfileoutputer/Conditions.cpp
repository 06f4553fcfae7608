#include "httpfileoutputer/Conditions.h"

#include <cstdint>
#include <cstdio>

#include "common/WithoutBlanks.h"
#include "httpfileoutputer/HttpDate.h"

namespace reference {

namespace {

/** Whether two changes fell into one second can be known only when it is over; clocks of file servers differ a little.
 */
constexpr time_t kSettleSeconds = 2;

constexpr std::string_view kWeak = "W/";

bool IsTagByte(char byte) {
    const auto code = static_cast<unsigned char>(byte);
    return code == 0x21 || (code >= 0x23 && code != 0x7f);
}

/** Takes a tag with its quotes from the front of the text; empty if there is none. */
std::string_view TakeTag(std::string_view& text) {
    if (text.empty() || text.front() != '"') {
        return {};
    }
    size_t end = 1;
    while (end < text.size() && IsTagByte(text[end])) {
        ++end;
    }
    if (end == text.size() || text[end] != '"') {
        return {};
    }
    const std::string_view tag = text.substr(0, end + 1);
    text.remove_prefix(end + 1);
    return tag;
}

/** Whether a list of tags, or "*", holds the tag. `weak`: weak tags count too. */
bool Holds(std::string_view list, std::string_view tag, bool weak) {
    list = WithoutBlanks(list);
    if (list == "*") {
        return true;
    }
    bool found = false;
    while (!list.empty()) {
        if (list.front() == ',' || list.front() == ' ' || list.front() == '\t') {
            list.remove_prefix(1);
            continue;
        }
        const bool isWeak = list.substr(0, kWeak.size()) == kWeak;
        if (isWeak) {
            list.remove_prefix(kWeak.size());
        }
        const std::string_view listed = TakeTag(list);
        if (listed.empty() || (!WithoutBlanks(list).empty() && WithoutBlanks(list).front() != ',')) {
            return false;
        }
        found = found || (listed == tag && (weak || !isWeak));
    }
    return found;
}

}  // namespace

Validators ValidatorsOf(const struct stat& status, time_t now) {
    char tag[80];
    snprintf(tag, sizeof(tag), "\"%jx-%jx-%jx.%lx\"", static_cast<std::uintmax_t>(status.st_ino),
             static_cast<std::uintmax_t>(status.st_size), static_cast<std::uintmax_t>(status.st_mtim.tv_sec),
             static_cast<unsigned long>(status.st_mtim.tv_nsec));
    return {tag, status.st_mtim.tv_sec, status.st_mtim.tv_sec <= now - kSettleSeconds};
}

Verdict Judge(const Conditions& conditions, const Validators& file, time_t now) {
    if (!conditions.match.empty()) {
        if (!Holds(conditions.match, file.tag, false)) {
            return Verdict::kFailed;
        }
    } else if (!conditions.unmodifiedSince.empty()) {
        const auto since = ReadHttpDate(WithoutBlanks(conditions.unmodifiedSince), now);
        if (since && file.modified > *since) {
            return Verdict::kFailed;
        }
    }
    if (!conditions.noneMatch.empty()) {
        return Holds(conditions.noneMatch, file.tag, true) ? Verdict::kNotModified : Verdict::kSend;
    }
    if (!conditions.modifiedSince.empty() && file.isSettled) {
        const auto since = ReadHttpDate(WithoutBlanks(conditions.modifiedSince), now);
        if (since && file.modified <= *since) {
            return Verdict::kNotModified;
        }
    }
    return Verdict::kSend;
}

bool AllowsRange(const Conditions& conditions, const Validators& file, time_t now) {
    const std::string_view value = WithoutBlanks(conditions.ifRange);
    if (value.empty()) {
        return true;
    }
    if (value.front() == '"') {
        return value == file.tag;
    }
    const auto date = ReadHttpDate(value, now);
    return date && file.isSettled && *date == file.modified;
}

}  // namespace reference
