#include "FakeProcess.h"

#include <syslog.h>

#include <algorithm>
#include <cctype>
#include <cerrno>

namespace fake {

namespace {

constexpr unsigned int kUnchanged = static_cast<unsigned int>(-1);

int Refuse(int error) {
    errno = error;
    return -1;
}

int SetIds(Ids& ids, const Ids& wanted, bool privileged) {
    for (unsigned int id : {wanted.real, wanted.effective, wanted.saved}) {
        if (id != kUnchanged && !privileged && !ids.Holds(id)) {
            return Refuse(EPERM);
        }
    }
    if (wanted.real != kUnchanged) {
        ids.real = wanted.real;
    }
    if (wanted.effective != kUnchanged) {
        ids.effective = wanted.effective;
    }
    if (wanted.saved != kUnchanged) {
        ids.saved = wanted.saved;
    }
    return 0;
}

}  // namespace

std::string Ids::Text() const {
    return std::to_string(real) + "/" + std::to_string(effective) + "/" + std::to_string(saved);
}

int FakeProcess::SetUser(unsigned int real, unsigned int effective, unsigned int saved) {
    return SetIds(user, {real, effective, saved}, user.effective == 0);
}

int FakeProcess::SetGroup(unsigned int real, unsigned int effective, unsigned int saved) {
    return SetIds(group, {real, effective, saved}, user.effective == 0);
}

int FakeProcess::SetGroups(const std::vector<gid_t>& list) {
    if (user.effective != 0) {
        return Refuse(EPERM);
    }
    groups = list;
    std::sort(groups.begin(), groups.end());
    return 0;
}

int FakeProcess::SetNice(int value) {
    if (value < nice && user.effective != 0) {
        return Refuse(EACCES);
    }
    nice = std::clamp(value, -20, 19);
    return 0;
}

int FakeProcess::ChangeHat(const char* name, unsigned long token) {
    if (hatBusy > 0) {
        --hatBusy;
        return Refuse(ECHILD);
    }
    if (!hat.empty() && token != hatToken) {
        return Refuse(EACCES);
    }
    if (name == nullptr) {
        if (hat.empty()) {
            return Refuse(EPERM);
        }
        hat.clear();
        return 0;
    }
    if (hats.count(name) == 0) {
        return Refuse(ENOENT);
    }
    hat = name;
    hatToken = token;
    return 0;
}

void FakeProcess::Log(int priority, const std::string& text, int error) {
    LogLine line;
    line.priority = LOG_PRI(priority);
    line.facility = priority & LOG_FACMASK;
    line.whole = text;
    line.error = error;
    const std::size_t colon = text.find(':');
    const std::size_t blank = text.find(' ');
    const bool numbered = colon != std::string::npos && blank != std::string::npos && colon + 1 < blank &&
                          std::all_of(text.begin() + static_cast<std::ptrdiff_t>(colon) + 1,
                                      text.begin() + static_cast<std::ptrdiff_t>(blank),
                                      [](unsigned char c) { return std::isdigit(c) != 0; });
    if (numbered) {
        line.source = text.substr(0, colon);
        line.text = text.substr(blank + 1);
    } else {
        line.text = text;
    }
    log.push_back(line);
}

}  // namespace fake
