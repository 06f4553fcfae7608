#include "FakePlatform.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>

namespace fake {

namespace {

FakePlatform* active = nullptr;

}  // namespace

FakePlatform::FakePlatform() {
    if (active != nullptr) {
        Unmodelled("a second fake platform");
    }
    active = this;
    users["system"] = {0, 0, {0}, true};
}

FakePlatform::~FakePlatform() {
    active = nullptr;
}

FakePlatform* FakePlatform::Active() {
    return active;
}

FakePlatform& FakePlatform::Required(const char* caller) {
    if (active == nullptr) {
        Unmodelled(std::string(caller) + " without a fake platform");
    }
    return *active;
}

bool FakePlatform::Enter(const char* name, const std::string& arguments, int error) {
    calls.push_back({name, arguments});
    if (error == 0) {
        return true;
    }
    ++failableSeen;
    if (failNumber != 0 && failableSeen == failNumber) {
        failedCall = name;
        failedIndex = calls.size() - 1;
        errno = error;
        return false;
    }
    const auto fault = namedFaults.find(name);
    if (fault == namedFaults.end() || fault->second.times == 0) {
        return true;
    }
    if (fault->second.skip > 0) {
        --fault->second.skip;
        return true;
    }
    if (fault->second.times > 0) {
        --fault->second.times;
    }
    errno = fault->second.error;
    return false;
}

std::vector<std::string> FakePlatform::CallsOf(const std::set<std::string>& names) const {
    std::vector<std::string> texts;
    for (const Call& call : calls) {
        if (names.count(call.name) != 0) {
            texts.push_back(call.Text());
        }
    }
    return texts;
}

int FakePlatform::CountOf(const std::string& name) const {
    return static_cast<int>(CallsOf({name}).size());
}

void FakePlatform::FailCall(int number) {
    failNumber = number;
    failableSeen = 0;
    failedCall.clear();
}

void FakePlatform::Fail(const std::string& name, int error, int skip, int times) {
    namedFaults[name] = {error, skip, times};
}

void FakePlatform::StopFailing() {
    namedFaults.clear();
    failNumber = 0;
}

std::string FakePlatform::Redirected(const std::string& path) const {
    for (const auto& [prefix, target] : redirects) {
        if (path.compare(0, prefix.size(), prefix) == 0) {
            return target + path.substr(prefix.size());
        }
    }
    return path;
}

Suspended::Suspended() : platform(active) {
    active = nullptr;
}

Suspended::~Suspended() {
    active = platform;
}

void Unmodelled(const std::string& what) {
    fprintf(stderr, "the fake platform does not model: %s\n", what.c_str());
    abort();
}

}  // namespace fake
