// The packages that use tasks, from their methods down to the record files.

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>

#include "PollingFixture.h"
#include "ZOVA.Core.Task/TaskMethods.h"
#include "ZOVA.Storage.Search/StartSearch.h"
#include "ZOVA.Storage.Search/TreeSearch.h"
#include "common/TaskCalls.h"

using package::SearchOrder;
using package::SearchState;
using package::TreeSearch;

namespace {

using TaskPackages = PollingTest;

using Method = void (*)(ZOVA::APIRequest*, ZOVA::APIResponse*);

std::string AnswerOf(Method method, const std::string& user, const std::string& params) {
    TaskCall call(user, params);
    call.response.SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
    method(&call.request, &call.response);
    return call.Body();
}

std::string RefusalOf(const std::string& parameter) {
    return R"({"error":{"code":101,"errors":{"parameter":")" + parameter + R"("}},"success":false})";
}

std::string ErrorOf(int code) {
    return R"({"error":{"code":)" + std::to_string(code) + R"(},"success":false})";
}

void SearchStatus(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    package::AnswerTaskStatus(request, response, package::kSearchPrefix);
}

void StopSearch(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    package::AnswerTaskStop(request, response, package::kSearchPrefix);
}

std::string Quoted(const std::string& text) {
    return Json::toString(Json::Value(text));
}

SearchState SearchTree(const std::string& pattern, const std::string& content = "") {
    SearchOrder order;
    order.path = InRoot("/tree");
    order.folder.Reset(open(order.path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    order.pattern = pattern;
    order.content = content;
    SearchState last;
    int reports = 0;
    TreeSearch search(order, [&](const SearchState& state) {
        EXPECT_GE(state.share, last.share);
        EXPECT_LE(state.share, 1);
        last = state;
        ++reports;
    });
    search.Run();
    EXPECT_GE(reports, 2) << "at the begin and at the end";
    EXPECT_TRUE(last.done);
    EXPECT_EQ(last.share, 1);
    std::sort(last.found.begin(), last.found.end());
    return last;
}

std::vector<std::string> InTree(std::vector<std::string> names) {
    for (std::string& name : names) {
        name = InRoot("/tree/") + name;
    }
    return names;
}

void MakeFolder(const std::string& name, mode_t mode = 0755) {
    ASSERT_EQ(mkdir(InRoot("/tree/" + name).c_str(), mode), 0);
    ASSERT_EQ(chmod(InRoot("/tree/" + name).c_str(), mode), 0);
}

}  // namespace

// ---- ZOVA.Core.Task ----

TEST_F(TaskPackages, StatusTakesOneIdOrSeveral) {
    TaskCall call("alice");
    ASSERT_TRUE(call.Start(ReportAndWork));
    const std::string id = call.TaskId();
    const std::string one = AnswerOf(package::TaskStatus, "alice", R"({"task_id":)" + Quoted(id) + "}");
    EXPECT_NE(one.find(R"("data":"working")"), std::string::npos) << one;
    const std::string several =
        AnswerOf(package::TaskStatus, "alice", R"({"task_id":["alice/gone",)" + Quoted(id) + "]}");
    EXPECT_NE(several.find(R"("alice/gone":{})"), std::string::npos) << several;
    EXPECT_NE(several.find(R"("data":"working")"), std::string::npos) << several;
}

TEST_F(TaskPackages, PassPollingErrorsOn) {
    EXPECT_EQ(AnswerOf(package::TaskStatus, "alice", R"({"task_id":"x"})"), ErrorOf(503));
    EXPECT_EQ(AnswerOf(package::TaskStatus, "alice", R"({"task_id":"bob/1"})"), ErrorOf(503));
    EXPECT_EQ(AnswerOf(package::TaskStatus, "alice", R"({"task_id":"alice/1"})"), ErrorOf(508));
    EXPECT_EQ(AnswerOf(package::TaskStatus, "alice", R"({"task_id":""})"), ErrorOf(502));
    EXPECT_EQ(AnswerOf(package::StopTask, "alice", R"({"task_id":"x"})"), ErrorOf(502));
    EXPECT_EQ(AnswerOf(package::StopTask, "alice", R"({"task_id":"alice/1"})"), ErrorOf(508));
    EXPECT_EQ(AnswerOf(package::ListTasks, "alice", R"({"groups":["admin"]})"), ErrorOf(505));
    EXPECT_EQ(AnswerOf(package::ListTasks, "alice", R"({"groups":["foo"]})"), ErrorOf(503));
}

TEST_F(TaskPackages, RefuseParametersOfAnotherKind) {
    std::string tooMany = "[";
    for (unsigned int number = 0; number < package::kMostTaskIds; ++number) {
        tooMany += "\"a\",";
    }
    tooMany += "\"a\"]";
    for (const std::string& id : {std::string("7"), std::string("null"), std::string("{}"), tooMany}) {
        EXPECT_EQ(AnswerOf(package::TaskStatus, "alice", R"({"task_id":)" + id + "}"), RefusalOf("task_id"));
    }
    EXPECT_EQ(AnswerOf(package::TaskStatus, "alice", "{}"), RefusalOf("task_id"));
    for (const char* params : {"{}", R"({"task_id":[]})", R"({"task_id":null})"}) {
        EXPECT_EQ(AnswerOf(package::StopTask, "alice", params), RefusalOf("task_id"));
    }
    EXPECT_EQ(AnswerOf(package::StopTask, "alice", R"({"task_id":"alice/1","remove":1})"), RefusalOf("remove"));
    EXPECT_EQ(AnswerOf(package::ListTasks, "alice", R"({"prefix":5})"), RefusalOf("prefix"));
    for (const char* groups : {R"("user")", "null", "5", R"(["user","user","user","user"])"}) {
        EXPECT_EQ(AnswerOf(package::ListTasks, "alice", R"({"groups":)" + std::string(groups) + "}"),
                  RefusalOf("groups"));
    }
}

TEST_F(TaskPackages, StopRemovesTheRecordUnlessToldOtherwise) {
    for (const bool remove : {true, false}) {
        TaskCall call("alice");
        ASSERT_TRUE(call.Start(ReportAndWork));
        const std::string params = R"({"task_id":)" + Quoted(call.TaskId()) + (remove ? "}" : R"(,"remove":false})");
        EXPECT_EQ(AnswerOf(package::StopTask, "alice", params), R"({"success":true})");
        EXPECT_EQ(Parse(ReadWholeFile(RecordPath("alice", IdOf(call.TaskId()))))["removed"], remove);
    }
}

TEST_F(TaskPackages, ListNamesOnesOwnTasksUnlessToldOtherwise) {
    EXPECT_EQ(AnswerOf(package::ListTasks, "alice", "{}"), R"({"data":{"user":null},"success":true})");
    ASSERT_TRUE(ZELM::Task("alice", "a-1").setProperty("info", 1));
    ASSERT_TRUE(ZELM::Task("alice", "b-1").setProperty("info", 1));
    EXPECT_EQ(AnswerOf(package::ListTasks, "alice", R"({"prefix":"b-"})"),
              R"({"data":{"user":["alice/b-1"]},"success":true})");
    EXPECT_EQ(AnswerOf(package::ListTasks, "bob", R"({"groups":["user","everyone"]})"),
              R"({"data":{"everyone":null,"user":null},"success":true})");
}

// ---- ZOVA.Storage.Search ----

TEST_F(TaskPackages, SearchRunsInTheBackgroundUpToItsResult) {
    MakeFolder("sub");
    WriteFile(InRoot("/tree/a.txt"), "hello", 0, 0644);
    WriteFile(InRoot("/tree/sub/b.txt"), "world!", 0, 0644);
    WriteFile(InRoot("/tree/sub/c.dat"), "", 0, 0644);
    TaskCall call("alice", R"({"folder":)" + Quoted(InRoot("/tree")) + R"(,"pattern":"*.txt"})");
    EXPECT_LT(SecondsOf([&] { package::StartSearch(&call.request, &call.response); }), 10);
    const std::string id = call.TaskId();
    ASSERT_EQ(id.substr(0, 13), "alice/search-") << call.Body();
    ASSERT_TRUE(Eventually([&] { return IsFinished(id); }));
    const Json::Value data = Parse(AnswerOf(SearchStatus, "alice", R"({"task_id":)" + Quoted(id) + "}"))["data"];
    EXPECT_EQ(data["finish"], true);
    EXPECT_EQ(data["data"]["done"], true);
    EXPECT_EQ(data["data"]["found_count"], 2);
    EXPECT_EQ(data["data"]["files"], 3);
    EXPECT_EQ(data["data"]["folders"], 2);
    EXPECT_EQ(data["data"]["bytes"], 11);
    EXPECT_EQ(data["data"]["share"].asDouble(), 1);
}

TEST_F(TaskPackages, SearchStopsOnDemand) {
    ASSERT_EQ(mkfifo(InRoot("/tree/pipe").c_str(), 0600), 0);
    WriteFile(InRoot("/tree/endless"), "");
    ASSERT_EQ(truncate(InRoot("/tree/endless").c_str(), 1L << 42), 0) << "no search through it ends by itself";
    TaskCall call("alice", R"({"folder":)" + Quoted(InRoot("/tree")) + R"(,"pattern":"*","content":"x"})");
    package::StartSearch(&call.request, &call.response);
    const std::string id = call.TaskId();
    const int pid = PidOf(id);
    ASSERT_GT(pid, 0);
    EXPECT_EQ(call.Status(id)["finish"], false);
    EXPECT_EQ(AnswerOf(StopSearch, "alice", R"({"task_id":)" + Quoted(id) + "}"), R"({"success":true})");
    EXPECT_TRUE(Eventually([pid] { return !IsRunning(pid); }));
    EXPECT_EQ(call.Status(id)["finish"], true);
}

TEST_F(TaskPackages, SearchKnowsSearchesOnly) {
    ASSERT_TRUE(ZELM::Task("alice", "copy-1").setProperty("info", 1));
    ASSERT_TRUE(ZELM::Task("alice", "search-1").setProperty("info", 1));
    EXPECT_EQ(AnswerOf(SearchStatus, "alice", R"({"task_id":"alice/copy-1"})"), ErrorOf(508));
    EXPECT_EQ(AnswerOf(StopSearch, "alice", R"({"task_id":"alice/copy-1"})"), ErrorOf(508));
    EXPECT_EQ(AnswerOf(SearchStatus, "alice", R"({"task_id":"copy-1"})"), ErrorOf(503));
    const std::string several = AnswerOf(SearchStatus, "alice", R"({"task_id":["alice/copy-1","alice/search-1"]})");
    EXPECT_EQ(several.find("copy"), std::string::npos) << several;
    EXPECT_NE(several.find("alice/search-1"), std::string::npos) << several;
}

TEST_F(TaskPackages, SearchRefusesParametersThatCannotBeUsed) {
    const std::string folder = Quoted(InRoot("/tree"));
    const struct {
        std::string folder;
        std::string pattern;
        std::string content;
        const char* refused;
    } rows[] = {
        {"\"tree\"", "\"*\"", "", "folder"},
        {"\"\"", "\"*\"", "", "folder"},
        {"7", "\"*\"", "", "folder"},
        {"null", "\"*\"", "", "folder"},
        {R"("/a\u0000b")", "\"*\"", "", "folder"},
        {Quoted("/" + std::string(5000, 'a')), "\"*\"", "", "folder"},
        {folder, "\"\"", "", "pattern"},
        {folder, "\"a/b\"", "", "pattern"},
        {folder, R"("a\u0000")", "", "pattern"},
        {folder, Quoted(std::string(256, 'a')), "", "pattern"},
        {folder, Quoted(std::string(17, '*')), "", "pattern"},
        {folder, "[]", "", "pattern"},
        {folder, "\"*\"", "\"\"", "content"},
        {folder, "\"*\"", Quoted(std::string(1025, 'a')), "content"},
        {folder, "\"*\"", "null", "content"},
    };
    for (const auto& row : rows) {
        const std::string params = R"({"folder":)" + row.folder + R"(,"pattern":)" + row.pattern +
                                   (row.content.empty() ? "" : R"(,"content":)" + row.content) + "}";
        EXPECT_EQ(AnswerOf(package::StartSearch, "alice", params), RefusalOf(row.refused)) << params;
    }
    EXPECT_TRUE(FilesIn(TaskFolder()).empty());
}

TEST_F(TaskPackages, SearchTellsWhenTheFolderCannotBeRead) {
    WriteFile(InRoot("/tree/file"), "");
    MakeFolder("private", 0700);
    for (const char* name : {"/tree/none", "/tree/file"}) {
        EXPECT_EQ(
            AnswerOf(package::StartSearch, "alice", R"({"folder":)" + Quoted(InRoot(name)) + R"(,"pattern":"*"})"),
            ErrorOf(401));
    }
    EXPECT_EQ(StatusOfChild(
                  [] {
                      return AnswerOf(package::StartSearch, "alice",
                                      R"({"folder":)" + Quoted(InRoot("/tree/private")) + R"(,"pattern":"*"})") ==
                                     ErrorOf(401)
                                 ? 0
                                 : 1;
                  },
                  kAlice.uid),
              0);
}

TEST_F(TaskPackages, SearchFindsOnlyWhatItsUserMayRead) {
    MakeFolder("open");
    MakeFolder("closed", 0700);
    WriteFile(InRoot("/tree/open/x"), "needle", 0, 0644);
    WriteFile(InRoot("/tree/open/secret"), "needle", 0, 0600);
    WriteFile(InRoot("/tree/closed/x"), "needle", 0, 0644);
    EXPECT_EQ(StatusOfChild(
                  [] {
                      const SearchState state = SearchTree("*", "needle");
                      return state.found == InTree({"open/x"}) && state.skipped == 2 ? 0 : 1;
                  },
                  kAlice.uid),
              0);
}

// ---- the walk ----

TEST_F(TaskPackages, TheWalkFindsNamesOfAnyKind) {
    MakeFolder("dir.x");
    WriteFile(InRoot("/tree/file.x"), "");
    WriteFile(InRoot("/tree/dir.x/.hidden.x"), "");
    ASSERT_EQ(symlink("/", InRoot("/tree/link.x").c_str()), 0);
    EXPECT_EQ(SearchTree("*.x").found, InTree({"dir.x", "dir.x/.hidden.x", "file.x", "link.x"}));
    EXPECT_EQ(SearchTree("[fd]*").found, InTree({"dir.x", "file.x"}));
    EXPECT_TRUE(SearchTree("nothing").found.empty());
}

TEST_F(TaskPackages, TheWalkFollowsNoLink) {
    MakeFolder("inside");
    ASSERT_EQ(mkdir(InRoot("/run/outside").c_str(), 0755), 0);
    WriteFile(InRoot("/run/outside/needle"), "needle");
    ASSERT_EQ(symlink(InRoot("/run/outside").c_str(), InRoot("/tree/inside/away").c_str()), 0);
    ASSERT_EQ(symlink("..", InRoot("/tree/inside/loop").c_str()), 0);
    ASSERT_EQ(symlink(InRoot("/run/outside/needle").c_str(), InRoot("/tree/inside/file").c_str()), 0);
    EXPECT_TRUE(SearchTree("needle").found.empty());
    EXPECT_TRUE(SearchTree("*", "needle").found.empty());
    EXPECT_EQ(SearchTree("*").folders, 2u);
}

TEST_F(TaskPackages, TheWalkFindsContentWhereverItLies) {
    const std::string filling(128 * 1024 - 3, 'x');
    WriteFile(InRoot("/tree/start"), "needle" + filling);
    WriteFile(InRoot("/tree/across"), filling + "needle" + filling);
    WriteFile(InRoot("/tree/end"), filling + filling + filling + "needle");
    WriteFile(InRoot("/tree/cut"), filling + "needl");
    WriteFile(InRoot("/tree/empty"), "");
    WriteFile(InRoot("/tree/short"), "n");
    EXPECT_EQ(SearchTree("*", "needle").found, InTree({"across", "end", "start"}));
    EXPECT_EQ(SearchTree("s*", "n").found, InTree({"short", "start"}));
}

TEST_F(TaskPackages, TheWalkKeepsTheFirstThousandAndCountsAll) {
    for (int number = 0; number < 1200; ++number) {
        WriteFile(InRoot("/tree/f" + std::to_string(number)), "12");
    }
    const SearchState state = SearchTree("f*");
    EXPECT_EQ(state.found.size(), 1000u);
    EXPECT_EQ(state.foundCount, 1200u);
    EXPECT_EQ(state.bytes, 2400u);
}

TEST_F(TaskPackages, TheWalkEndsOnATreeDeeperThanItGoes) {
    EXPECT_EQ(StatusOfChild([] {
                  if (chdir(InRoot("/tree").c_str()) != 0) {
                      return 1;
                  }
                  for (int level = 0; level < 400; ++level) {
                      if (mkdir("d", 0755) != 0 || chdir("d") != 0) {
                          return 2;
                      }
                  }
                  const SearchState state = SearchTree("d");
                  return state.folders == 256 && state.skipped == 1 ? 0 : 3;
              }),
              0);
}

TEST_F(TaskPackages, TheWalkTellsNamesThatAreNoTextAsSuch) {
    WriteFile(InRoot("/tree/\xff\xfe"), "");
    const SearchState state = SearchTree("*");
    const std::string json = Json::toString(state.ToJson()["found"]);
    EXPECT_NE(json.find("\xef\xbf\xbd\xef\xbf\xbd"), std::string::npos) << json;
    EXPECT_EQ(json.find('\xff'), std::string::npos);
}

TEST_F(TaskPackages, APatternOfManyStarsIsNoTrap) {
    WriteFile(InRoot("/tree/" + std::string(255, 'a')), "");
    std::string pattern;
    for (int star = 0; star < 16; ++star) {
        pattern += "*a";
    }
    EXPECT_LT(SecondsOf([&] { SearchTree(pattern + "b"); }), 10);
}
