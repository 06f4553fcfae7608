#include <sys/wait.h>

#include <utility>

#include "PollingFixture.h"

using ZOVA::APIPolling;
using ZOVA::APIPollingPrivate;
using ZOVA::APIRequest;

namespace {

using TaskIdentityTest = TaskTest;

struct SplitRow {
    const char* name;
    const char* fullId;
    bool good;
    const char* owner;
    const char* id;
};

class FullTaskId : public ::testing::TestWithParam<SplitRow> {};

struct OwnerRow {
    const char* name;
    const char* user;
    const char* owner;
    bool allowed;
    const char* line;
};

class OwnerCheck : public TaskTest, public ::testing::WithParamInterface<OwnerRow> {};

struct ListRow {
    const char* name;
    const char* owner;
    const char* ids;
    const char* result;
};

class FullIds : public ::testing::TestWithParam<ListRow> {};

}  // namespace

TEST_P(FullTaskId, IsPartedAtItsFirstSlash) {
    std::string owner = "old owner";
    std::string id = "old id";
    EXPECT_EQ(APIPollingPrivate::GetUserAndTaskID(GetParam().fullId, owner, id), GetParam().good);
    EXPECT_EQ(owner, GetParam().owner);
    EXPECT_EQ(id, GetParam().id);
}

INSTANTIATE_TEST_SUITE_P(Rows, FullTaskId,
                         ::testing::Values(SplitRow{"Plain", "alice/1", true, "alice", "1"},
                                           SplitRow{"MoreSlashes", "alice/abc/def", true, "alice", "abc/def"},
                                           SplitRow{"EmptyOwner", "/abc", true, "", "abc"},
                                           SplitRow{"EmptyId", "alice/", true, "alice", ""},
                                           SplitRow{"OnlySlash", "/", true, "", ""},
                                           SplitRow{"NoSlash", "abc", false, "old owner", "old id"},
                                           SplitRow{"Empty", "", false, "old owner", "old id"}),
                         [](const auto& row) { return std::string(row.param.name); });

TEST_P(OwnerCheck, LetsAUserSeeOwnAndSharedTasksOnly) {
    const OwnerRow& row = GetParam();
    APIRequest request(RequestOf(row.user));
    const APIPollingPrivate polling(nullptr, &request);
    EXPECT_EQ(polling.CheckTaskUser(row.owner), row.allowed);
    EXPECT_EQ(LogLines().size(), row.allowed ? 0u : 1u);
    EXPECT_EQ(LoggedTimes(row.line), row.allowed ? 0 : 1);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, OwnerCheck,
    ::testing::Values(OwnerRow{"Own", "alice", "alice", true, "-"}, OwnerRow{"Everyones", "alice", "@users", true, "-"},
                      OwnerRow{"AnotherUsers", "alice", "bob", false, "Invalid task id"},
                      OwnerRow{"AnotherUsersForAnAdministrator", "boss", "bob", false, "Invalid task id"},
                      OwnerRow{"AdministratorsForOne", "boss", "@administrators", true, "-"},
                      OwnerRow{"AdministratorsForAUser", "alice", "@administrators", false, "Permission denied"},
                      OwnerRow{"EmptyForAUser", "alice", "", false, "Invalid task id"},
                      OwnerRow{"EmptyForNobody", "", "", true, "-"}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_P(FullIds, KeepTheShapeOfTheListing) {
    EXPECT_EQ(Json::toString(APIPollingPrivate::ConverToFullTaskId(GetParam().owner, Parse(GetParam().ids))),
              GetParam().result);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, FullIds,
    ::testing::Values(ListRow{"Text", "alice", "\"1\"", "\"alice/1\""}, ListRow{"Null", "alice", "null", "null"},
                      ListRow{"EmptyArray", "alice", "[]", "null"}, ListRow{"EmptyObject", "alice", "{}", "null"},
                      ListRow{"Array", "alice", R"(["b","a",3])", R"(["alice/b","alice/a","alice/3"])"},
                      ListRow{"Object", "alice", R"({"x":"1","y":2})", R"({"x":"alice/1","y":"alice/2"})"},
                      ListRow{"NestedArray", "alice", "[[1]]", R"(["alice/"])"},
                      ListRow{"Number", "alice", "5", "null"}, ListRow{"Bool", "alice", "true", "null"},
                      ListRow{"NoOwner", "", "[\"1\"]", "null"}),
    [](const auto& row) { return std::string(row.param.name); });

// ---- attributes and errors ----

TEST_F(TaskIdentityTest, StartsWithError500) {
    EXPECT_EQ(APIPolling().GetError(), 500);
    APIPolling polling;
    polling.SetError(7);
    EXPECT_EQ(polling.GetError(), 7);
}

TEST_F(TaskIdentityTest, SharesWithNobodyForAnybody) {
    APIPolling polling;
    EXPECT_TRUE(polling.SetGroupAttr(""));
    EXPECT_EQ(polling.GetError(), 500);
}

TEST_F(TaskIdentityTest, SharesWithEveryoneWithoutARequest) {
    EXPECT_TRUE(APIPolling().SetGroupAttr("everyone"));
}

TEST_F(TaskIdentityTest, RefusesAnUnknownGroup) {
    APIPolling polling;
    for (const char* group : {"user", "Admin", "admin ", "@administrators"}) {
        EXPECT_FALSE(polling.SetGroupAttr(group)) << group;
        EXPECT_EQ(polling.GetError(), 502);
    }
    EXPECT_EQ(LoggedTimes("bad parameters"), 4);
}

TEST_F(TaskIdentityTest, SharesWithAdministratorsForAnAdministratorOnly) {
    APIPolling without;
    EXPECT_FALSE(without.SetGroupAttr("admin"));
    EXPECT_EQ(without.GetError(), 505);
    APIRequest alice(RequestOf("alice"));
    APIPolling user(&alice);
    EXPECT_FALSE(user.SetGroupAttr("admin"));
    EXPECT_EQ(user.GetError(), 505);
    APIRequest boss(RequestOf("boss"));
    user.SetRequest(&boss);
    EXPECT_TRUE(user.SetGroupAttr("admin"));
    EXPECT_EQ(user.GetError(), 505) << "an error is never cleared";
    EXPECT_EQ(LoggedTimes("APIPolling:"), 2);
    EXPECT_EQ(LoggedTimes("No permission"), 2);
}

// ---- signals ----

TEST_F(TaskIdentityTest, DoKillNeverSignalsMoreThanOneProcess) {
    for (int pid : {0, -1, -getpid()}) {
        EXPECT_FALSE(APIPollingPrivate::DoKill(pid));
    }
    EXPECT_EQ(LoggedTimes("invalid process id"), 3);
}

TEST_F(TaskIdentityTest, DoKillSendsSigterm) {
    const pid_t child = fork();
    if (child == 0) {
        pause();
        _exit(0);
    }
    EXPECT_TRUE(APIPollingPrivate::DoKill(child));
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGTERM);
    EXPECT_TRUE(APIPollingPrivate::DoKill(child)) << "one that has gone counts as stopped";
}

TEST_F(TaskIdentityTest, DoKillTellsWhenItMayNot) {
    EXPECT_EQ(StatusOfChild(
                  [] {
                      const bool killed = APIPollingPrivate::DoKill(getppid());
                      return !killed && LoggedTimes("Failed to kill " + std::to_string(getppid()) +
                                                    ", reason=Operation not permitted(1)") == 1
                                 ? 0
                                 : 1;
                  },
                  kAlice.uid),
              0);
}
