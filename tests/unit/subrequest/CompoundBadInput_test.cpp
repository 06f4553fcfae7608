// Batches as a client should not write them, through the web entry where their form matters.

#include <sys/resource.h>

#include "ChildRun.h"
#include "SubrequestTest.h"
#include "WebCall.h"
#include "webapi/Json.h"

using unit::J;
using unit::List;
using unit::WebAnswer;
using unit::WebCall;
using ZOVA::APIRequest;
using ZOVA::APIResponse;

namespace {

using Texts = std::vector<std::string>;

class CompoundBadInput : public unit::SubrequestTest {
protected:
    static std::string Encoded(const std::string& text) {
        constexpr const char* kHex = "0123456789ABCDEF";
        std::string encoded;
        for (unsigned char c : text) {
            if (isalnum(c) != 0) {
                encoded += static_cast<char>(c);
            } else {
                encoded += {'%', kHex[c >> 4], kHex[c & 15]};
            }
        }
        return encoded;
    }

    /** Posts a batch with this text as "compound". */
    static WebAnswer Post(const std::string& compound, const std::string& more = "") {
        return Serve(
            WebCall::Post("api=ZOVA.Entry.Request&version=1&method=request&compound=" + Encoded(compound) + more));
    }

    static std::string Repeated(const std::string& text, int count) {
        std::string all;
        for (int i = 0; i < count; ++i) {
            all += (i == 0 ? "" : ",") + text;
        }
        return all;
    }
};

constexpr int kMany = 10000;
constexpr const char* kLocalEntry = R"({"api": "ZOVA.Test.Hook", "version": 1, "method": "local", "do": "succeed"})";

TEST_F(CompoundBadInput, TenThousandEntriesAreServed) {
    const WebAnswer answer = Post("[" + Repeated(kLocalEntry, kMany) + "]");
    ASSERT_TRUE(answer.wellFormed) << answer.child.end;
    const Json::Value& data = answer.body["data"];
    EXPECT_EQ(data["result"].size(), static_cast<Json::ArrayIndex>(kMany));
    EXPECT_FALSE(data["has_fail"].asBool());
    EXPECT_TRUE(data["result"][kMany - 1]["success"].asBool());
}

TEST_F(CompoundBadInput, TenThousandEntriesThatNameNothingAreServed) {
    const WebAnswer answer = Post("[" + Repeated("0", kMany) + "]");
    ASSERT_TRUE(answer.wellFormed) << answer.child.end;
    EXPECT_EQ(Outcomes(answer.body), Texts(kMany, "101"));
}

TEST_F(CompoundBadInput, TenThousandParallelEntriesFailOneByOneWhereDescriptorsRunOut) {
    const unit::ChildResult child = unit::RunInChild("", [this] {
        const rlimit limit{150, 150};
        setrlimit(RLIMIT_NOFILE, &limit);
        Json::Value compound(Json::arrayValue);
        for (int i = 0; i < kMany; ++i) {
            compound.append(J("{}"));
        }
        std::map<std::string, int> counts;
        for (const std::string& outcome : Outcomes(Parallel(compound))) {
            ++counts[outcome];
        }
        platform.process.log.clear();
        Json::Value report(Json::objectValue);
        for (const auto& [outcome, count] : counts) {
            report[outcome] = count;
        }
        return report;
    });
    ASSERT_TRUE(child.orderly) << child.end;
    EXPECT_GE(child.report["101"].asInt(), 20);
    EXPECT_EQ(child.report["101"].asInt() + child.report["117"].asInt(), kMany);
    EXPECT_EQ(child.forked, Texts(static_cast<std::size_t>(child.report["101"].asInt()), "status 0"));
}

TEST_F(CompoundBadInput, HundredsOfSequentialChildrenLeaveNothingBehind) {
    constexpr int kChildren = 300;
    const std::vector<int> before = unit::OpenDescriptorNumbers();
    Json::Value compound(Json::arrayValue);
    for (int i = 0; i < kChildren; ++i) {
        compound.append(Entry("child", "succeed"));
    }
    EXPECT_EQ(Outcomes(Batch(compound)), Texts(kChildren, "success"));
    EXPECT_EQ(unit::OpenDescriptorNumbers().size(), before.size());
    EXPECT_EQ(TakeChildren().size(), static_cast<std::size_t>(kChildren));
}

TEST_F(CompoundBadInput, EntriesThatAreNoObjectsAnswer101) {
    const Json::Value compound = J(R"([null, 5, -1, 1.5, true, "api", [], {}, [{"api": "ZOVA.Test.Hook"}],
        18446744073709551615, ""])");
    for (const char* mode : {"sequential", "parallel"}) {
        Json::Value more(Json::objectValue);
        more["mode"] = mode;
        const Json::Value body = Batch(compound, more);
        EXPECT_EQ(Outcomes(body), Texts(compound.size(), "101")) << mode;
        for (const Json::Value& result : body["data"]["result"]) {
            EXPECT_JSON(result, R"({"success": false, "error": {"code": 101}})");
        }
    }
}

TEST_F(CompoundBadInput, NamesOfAnyTypeAreSurvived) {
    struct Row {
        const char* entry;
        const char* outcome;
        const char* log;
    };
    const Row rows[] = {
        {R"({"api": null, "version": null, "method": null})", "101", ""},
        {R"({"api": [], "version": {}, "method": []})", "101", ""},
        {R"({"api": "ZOVA.Test.Hook", "version": "1", "method": "local", "do": "succeed"})", "success", ""},
        {R"({"api": "ZOVA.Test.Hook", "version": 1e300, "method": "local"})", "101", ""},
        {R"({"api": "ZOVA.Test.Hook", "version": -1, "method": "local"})", "101", ""},
        {R"({"api": "ZOVA.Test.Hook", "version": 3, "method": "local"})", "104", ""},
        {R"({"api": "ZOVA.Test.Hook", "version": 1, "method": 5})", "103", ""},
        {R"({"api": 5, "version": 1, "method": "x"})", "102", "WebAPI 5 is not valid"},
        {R"({"api": "../../etc/passwd", "version": 1, "method": "x"})", "102", "WebAPI ../../etc/passwd is not valid"},
        {R"({"api": "a\nforged", "version": 1, "method": "x"})", "102", nullptr},
        {R"({"api": "ZOVA.Test.Nobody", "version": 1, "method": "x"})", "102", ""},
    };
    for (const Row& row : rows) {
        platform.process.log.clear();
        EXPECT_EQ(Outcomes(Batch(List(J(row.entry)))), (Texts{row.outcome})) << row.entry;
        for (const fake::LogLine& line : platform.process.log) {
            EXPECT_EQ(line.whole.find('\n'), std::string::npos) << row.entry;
            if (row.log != nullptr && row.log[0] != '\0') {
                EXPECT_EQ(line.text, row.log);
            }
        }
    }
    platform.process.log.clear();
}

TEST_F(CompoundBadInput, AnEntryWithAValueNestedDeepIsServed) {
    const std::string deep = std::string(250, '[') + std::string(250, ']');
    const WebAnswer answer =
        Post(R"([{"api": "ZOVA.Test.Hook", "version": 1, "method": "local", "do": "fail", "x": )" + deep + "}]");
    ASSERT_TRUE(answer.wellFormed) << answer.child.end;
    EXPECT_EQ(Outcomes(answer.body), (Texts{"1"}));
}

TEST_F(CompoundBadInput, ACompoundNestedAThousandDeepIsNoArrayAndAnswers110) {
    const WebAnswer answer = Post(std::string(1000, '[') + std::string(1000, ']'));
    ASSERT_TRUE(answer.wellFormed) << answer.child.end;
    EXPECT_EQ(answer.ErrorCode(), 110);
    ExpectLog(LOG_ERR, "ParseParams failed", "CompoundHandler.cpp");
}

TEST_F(CompoundBadInput, TextsThatAreNoArrayAnswer110) {
    for (const char* text : {"", "x", "[", "[1", "{}", "null", "5", "\"[]\"", "[1]]", "[1],[2]"}) {
        const WebAnswer answer = Post(text);
        ASSERT_TRUE(answer.wellFormed) << text << answer.child.end;
        EXPECT_EQ(answer.ErrorCode(), 110) << text;
        ExpectLog(LOG_ERR, "ParseParams failed", "CompoundHandler.cpp");
    }
}

std::string NestedBatch(int depth, const std::string& innermost) {
    std::string batch = innermost;
    for (int i = 0; i < depth; ++i) {
        batch = R"([{"api":"ZOVA.Entry.Request","version":1,"method":"request","compound":)" + batch + "}]";
    }
    return batch;
}

/** How many batches stand in one another in an answer, down to an empty one. */
int DepthOf(const Json::Value& body) {
    int depth = 0;
    const Json::Value* batch = &body;
    while (Json::member(Json::member(*batch, "data"), "result").size() == 1) {
        batch = &(*batch)["data"]["result"][0];
        ++depth;
    }
    return Json::asBool(Json::member(*batch, "success")) ? depth : -1;
}

TEST_F(CompoundBadInput, BatchesInBatchesAreServedAsDeepAsTheyCanBeRead) {
    constexpr int kDepth = 60;
    const WebAnswer answer = Post(NestedBatch(kDepth, "[]"));
    ASSERT_TRUE(answer.wellFormed) << answer.child.end;
    EXPECT_EQ(DepthOf(answer.body), kDepth);
}

TEST_F(CompoundBadInput, BatchesInBatchesInChildrenAreServed) {
    constexpr int kDepth = 10;
    Json::Value compound;
    ASSERT_TRUE(Json::fromString(compound, NestedBatch(kDepth, "[" + std::string(kLocalEntry) + "]")));
    for (Json::Value* level = &compound; level->isArray() && (*level)[0].isMember("compound");) {
        (*level)[0]["mode"] = "parallel";
        level = &(*level)[0]["compound"];
    }
    EXPECT_EQ(DepthOf(Parallel(compound)), kDepth + 1);
    EXPECT_EQ(TakeChildren().size(), static_cast<std::size_t>(kDepth + 1));
}

TEST_F(CompoundBadInput, ABatchDeeperThanCanBeReadAnswers110) {
    const WebAnswer answer = Post(NestedBatch(200, "[]"));
    ASSERT_TRUE(answer.wellFormed) << answer.child.end;
    EXPECT_EQ(answer.ErrorCode(), 110);
    ExpectLog(LOG_ERR, "ParseParams failed", "CompoundHandler.cpp");
}

TEST_F(CompoundBadInput, AnEntryThatRelaysAnswers109) {
    Json::Value entry = Entry("local", "succeed");
    entry["relay_zn"] = "peer";
    EXPECT_EQ(Outcomes(Batch(List(entry))), (Texts{"109"}));
}

TEST_F(CompoundBadInput, AnUploadAsABatchRefusesItsEntries) {
    runner.Request()->InitEnv(J(R"({"CONTENT_TYPE": "multipart/form-data; boundary=x"})"));
    EXPECT_EQ(Outcomes(Batch(List(Entry("local", "succeed")))), Texts{});
    EXPECT_EQ(runner.Response()->GetError(), 115);
}

TEST_F(CompoundBadInput, AnEntryMeetsTheGateOfTheWebEntry) {
    HookAPI()["authLevel"] = 1;
    Install();
    const std::string compound = "[" + std::string(kLocalEntry) + "]";
    const WebAnswer refused = Post(compound);
    ASSERT_TRUE(refused.wellFormed) << refused.child.end;
    EXPECT_EQ(Outcomes(refused.body), (Texts{"119"}));
    WebCall call = WebCall::Post("api=ZOVA.Entry.Request&version=1&method=request&compound=" + Encoded(compound));
    EXPECT_EQ(Outcomes(Serve(call.With("HTTP_COOKIE", "id=alice-sid")).body), (Texts{"success"}));
    const WebAnswer parallel = Serve(WebCall::Post(call.body + "&mode=parallel").With("HTTP_COOKIE", "id=alice-sid"));
    EXPECT_EQ(Outcomes(parallel.body), (Texts{"success"}));
    EXPECT_EQ(parallel.child.forked, (Texts{"status 0"}));
}

TEST_F(CompoundBadInput, AnEntryCannotPassItselfOffAsAnotherUser) {
    HookAPI()["authLevel"] = 1;
    Install();
    const std::string entry =
        R"([{"api": "ZOVA.Test.Hook", "version": 1, "method": "local", "do": "tell_request",
            "session": {"username": "admin"}, "environ": {"REMOTE_USER": "admin"}, "username": "admin"}])";
    const WebAnswer answer =
        Serve(WebCall::Post("api=ZOVA.Entry.Request&version=1&method=request&compound=" + Encoded(entry))
                  .With("HTTP_COOKIE", "id=alice-sid"));
    ASSERT_TRUE(answer.wellFormed) << answer.child.end;
    EXPECT_EQ(answer.body["data"]["result"][0]["data"]["user"], "alice");
    EXPECT_FALSE(answer.body["data"]["result"][0]["data"]["env"].isMember("REMOTE_USER"));
}

}  // namespace
