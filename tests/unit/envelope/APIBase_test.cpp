#include "webapi/APIBase.h"

#include "FrameworkTest.h"

using unit::J;
using ZOVA::APIBase;

namespace {

class APIBaseTest : public unit::FrameworkTest {
protected:
    static void Fill(APIBase& store, const std::string& document) {
        Json::Value value = J(document);
        store.Deserialize(value);
    }

    APIBase store;
};

TEST_F(APIBaseTest, BeginsAsAnEmptyObject) {
    EXPECT_JSON(store.Serialize(), "{}");
}

TEST_F(APIBaseTest, CreatesASectionOnce) {
    EXPECT_TRUE(store.InitField("s"));
    EXPECT_FALSE(store.InitField("s"));
    EXPECT_FALSE(store.InitField(""));
    EXPECT_JSON(store.Serialize(), R"({"s": {}})");
}

TEST_F(APIBaseTest, WritingNeverCreatesASection) {
    EXPECT_FALSE(store.SetData("none", "k", 1, false));
    EXPECT_FALSE(store.SetData("none", J(R"({"k": 1})"), false));
    EXPECT_JSON(store.Serialize(), "{}");
}

TEST_F(APIBaseTest, RefusesAnEmptyKeyAndAValueThatIsNoTextWhereTextsAreAskedFor) {
    store.InitField("s");
    EXPECT_FALSE(store.SetData("s", "", 1, false));
    EXPECT_FALSE(store.SetData("s", "k", 1, true));
    EXPECT_FALSE(store.SetData("s", "k", Json::Value(), true));
    EXPECT_TRUE(store.SetData("s", "k", "text", true));
    EXPECT_TRUE(store.SetData("s", "n", Json::Value(), false));
    EXPECT_JSON(store.Serialize(), R"({"s": {"k": "text", "n": null}})");
}

TEST_F(APIBaseTest, AnObjectIsCopiedOverTheSection) {
    Fill(store, R"({"s": {"a": 1, "b": 2}})");
    EXPECT_TRUE(store.SetData("s", J(R"({"b": 3, "c": 4})"), false));
    EXPECT_JSON(store.Serialize(), R"({"s": {"a": 1, "b": 3, "c": 4}})");
}

TEST_F(APIBaseTest, OnlyANonEmptyObjectIsCopied) {
    store.InitField("s");
    for (const char* value : {"{}", "null", "[]", "[1]", "5", "\"x\"", "true"}) {
        EXPECT_FALSE(store.SetData("s", J(value), false)) << value;
    }
    EXPECT_JSON(store.Serialize(), R"({"s": {}})");
}

TEST_F(APIBaseTest, WithTextsOnlyOtherMembersAreSkippedAndTheResultIsStillTrue) {
    Fill(store, R"({"environ": {"a": "1"}})");
    EXPECT_TRUE(store.SetData("environ", J(R"({"a": 2, "b": null, "c": {}})"), true));
    EXPECT_JSON(store.Serialize(), R"({"environ": {"a": "1"}})");
    EXPECT_TRUE(store.SetData("environ", J(R"({"a": 2, "b": "x"})"), true));
    EXPECT_JSON(store.Serialize(), R"({"environ": {"a": "1", "b": "x"}})");
}

TEST_F(APIBaseTest, AMemberThatHoldsNullIsPresent) {
    Fill(store, R"({"s": {"k": null}})");
    EXPECT_TRUE(store.HasData("s", "k"));
    EXPECT_TRUE(store.GetData("s", "k", 7).isNull());
    EXPECT_FALSE(store.HasData("s", "other"));
    EXPECT_FALSE(store.HasData("other", "k"));
    EXPECT_FALSE(store.HasData("s", ""));
}

TEST_F(APIBaseTest, ReadingGivesTheValueTheSectionOrTheCallersDefault) {
    Fill(store, R"({"s": {"k": 1}})");
    const Json::Value fallback = "d";
    EXPECT_EQ(&store.GetData("s", "none", fallback), &fallback);
    EXPECT_EQ(&store.GetData("none", "k", fallback), &fallback);
    EXPECT_EQ(&store.GetData("none", fallback), &fallback);
    EXPECT_EQ(&store.GetData("s", "k", fallback), &store.Serialize()["s"]["k"]);
    EXPECT_EQ(&store.GetData("s", "", fallback), &store.Serialize()["s"]);
    EXPECT_EQ(&store.GetData("s", fallback), &store.Serialize()["s"]);
}

TEST_F(APIBaseTest, ClearsAKeyOrAllOfASection) {
    Fill(store, R"({"s": {"a": 1, "b": 2}, "t": {"c": 3}})");
    EXPECT_FALSE(store.ClearData("", "a"));
    EXPECT_FALSE(store.ClearData("none", "a"));
    EXPECT_FALSE(store.ClearData("none", ""));
    EXPECT_FALSE(store.ClearData("s", "none"));
    EXPECT_TRUE(store.ClearData("s", "a"));
    EXPECT_JSON(store.Serialize(), R"({"s": {"b": 2}, "t": {"c": 3}})");
    EXPECT_TRUE(store.ClearData("s", ""));
    EXPECT_TRUE(store.ClearData("s", ""));
    EXPECT_JSON(store.Serialize(), R"({"s": {}, "t": {"c": 3}})");
}

TEST_F(APIBaseTest, AfterDeserializeTheArgumentHoldsTheOldStore) {
    store.InitField("old");
    Json::Value document = J(R"({"new": {}})");
    store.Deserialize(document);
    EXPECT_JSON(document, R"({"old": {}})");
    EXPECT_JSON(store.Serialize(), R"({"new": {}})");
}

TEST_F(APIBaseTest, TheShortReaderGoesThroughTheVirtualTable) {
    class Counting : public APIBase {
    public:
        using APIBase::GetData;
        const Json::Value& GetData(const std::string&, const std::string& key, const Json::Value&) const override {
            lastKey = key + "!";
            return value;
        }
        mutable std::string lastKey;
        Json::Value value = 9;
    };
    const Counting counting;
    const APIBase& base = counting;
    EXPECT_EQ(base.GetData("s", Json::Value()), Json::Value(9));
    EXPECT_EQ(counting.lastKey, "!");
}

// ---- documents of any shape ----

class StoreDocument : public APIBaseTest, public ::testing::WithParamInterface<const char*> {};

TEST_P(StoreDocument, NeverMakesAnOperationThrowAndRefusesToBeWritten) {
    const Json::Value fallback = "d";
    EXPECT_NO_THROW({
        Fill(store, GetParam());
        EXPECT_FALSE(store.HasData("s", "k"));
        EXPECT_EQ(store.GetData("s", "k", fallback), fallback);
        EXPECT_EQ(store.GetData("s", "", fallback), fallback);
        EXPECT_EQ(store.GetData("s", fallback), fallback);
        EXPECT_FALSE(store.SetData("s", "k", 1, false));
        EXPECT_FALSE(store.SetData("s", J(R"({"k": 1})"), false));
        EXPECT_FALSE(store.ClearData("s", "k"));
        EXPECT_FALSE(store.ClearData("s", ""));
        EXPECT_FALSE(store.InitField(""));
    });
    EXPECT_JSON(store.Serialize(), GetParam());
}

INSTANTIATE_TEST_SUITE_P(Rows, StoreDocument,
                         ::testing::Values("null", "[]", "[1,2]", "5", "\"s\"", "true", "1.5", R"({"s": null})",
                                           R"({"s": 5})", R"({"s": "k"})", R"({"s": ["k"]})", R"({"s": false})"));

}  // namespace
