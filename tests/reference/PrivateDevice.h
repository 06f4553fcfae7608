#pragma once

#include <gtest/gtest.h>
#include <sys/types.h>

#include <functional>
#include <optional>
#include <string>
#include <string_view>

/** Accounts of the private user database. All passwords are `kPassword`. */
constexpr const char* kPassword = "correct horse battery";
constexpr uid_t kAliceUid = 61001;
constexpr gid_t kAliceGid = 61001;
constexpr gid_t kFriendsGid = 61101;
constexpr gid_t kAdministratorsGid = 61100;

/**
 * Mounts a private root for the library's files and a private user database over /etc, in a mount namespace of this
 * process. Fails the run where that is not allowed.
 */
class PrivateMachine : public ::testing::Environment {
public:
    void SetUp() override;
};

/** Absolute path inside the private root. */
std::string InRoot(const std::string& path);

/** Writes a file with its folders; mode 0600, owned by root. */
void WriteFile(const std::string& path, std::string_view content);
std::string ReadWholeFile(const std::string& path);
bool Exists(const std::string& path);
/** Permission bits of the file itself. */
unsigned int ModeOf(const std::string& path);
/** Sets the time of last change to that many seconds ago. */
void MakeOlder(const std::string& path, long seconds);

/** Runs `body` in a forked child; its result is the child's exit status. -1 if a signal ended it. */
int StatusOfChild(const std::function<int()>& body);

/** Sets, or with null removes, a variable of the environment for as long as it lives. */
class ScopedVariable {
public:
    ScopedVariable(const char* name, const char* value);
    ScopedVariable(const ScopedVariable&) = delete;
    ScopedVariable& operator=(const ScopedVariable&) = delete;
    ~ScopedVariable();

private:
    std::string name;
    std::optional<std::string> before;
};

/** Starts each test with an empty device: no sessions, no secrets, no settings, fresh homes. */
class DeviceTest : public ::testing::Test {
protected:
    void SetUp() override;
};
