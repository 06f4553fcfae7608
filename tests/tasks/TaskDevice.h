#pragma once

#include <gtest/gtest.h>
#include <json/value.h>
#include <sys/types.h>

#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "webapi/APIRequest.h"

/** Accounts of the private user database; boss is an administrator. */
struct TestUser {
    const char* name;
    uid_t uid;
};

constexpr TestUser kAlice = {"alice", 61001};
constexpr TestUser kBob = {"bob", 61002};
constexpr TestUser kBoss = {"boss", 61003};
/** Of no account. */
constexpr uid_t kUnknownUid = 61999;

/** Mounts a private root for the store and a private user database over /etc, in a mount namespace of this process. */
class TaskMachine : public ::testing::Environment {
public:
    void SetUp() override;
};

/** Starts each test with an empty store and an empty log. */
class TaskTest : public ::testing::Test {
protected:
    void SetUp() override;
};

std::string InRoot(const std::string& path);
std::string TaskFolder();
/** The file of a task's record. */
std::string RecordPath(const std::string& owner, const std::string& id);
void WriteFile(const std::string& path, std::string_view content, uid_t owner = 0, mode_t mode = 0600);
std::string ReadWholeFile(const std::string& path);
bool Exists(const std::string& path);
/** Sets the time of last change to that many seconds ago. */
void MakeOlder(const std::string& path, long seconds);
std::vector<std::string> FilesIn(const std::string& folder);

/** Lines logged by this process since the test began. */
const std::vector<std::string>& LogLines();
/** How many lines of the log hold the text. */
int LoggedTimes(const std::string& text);

/** Runs `body` in a forked child, as that user for good. @return its exit status, -1 if a signal ended it. */
int StatusOfChild(const std::function<int()>& body, uid_t uid = 0);

/** Looks every few milliseconds until it holds; false after ten seconds. */
bool Eventually(const std::function<bool()>& holds);
/** Whether a process of that id runs and is no zombie. */
bool IsRunning(pid_t pid);
double SecondsOf(const std::function<void()>& body);

Json::Value Parse(const std::string& text);
/** A request of that user, "" for nobody, with those parameters. */
Json::Value RequestOf(const std::string& user, const std::string& params = "{}");
