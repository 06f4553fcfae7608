#include <gtest/gtest.h>

#include "../../packages/ZOVA.Storage.File/UploadWishes.h"
#include "Call.h"

namespace {

using package::Existing;
using package::UploadWishes;

std::string Bad(const std::string& params) {
    UploadWishes wishes;
    const char* bad = wishes.Read(Parse(params));
    return bad == nullptr ? "" : bad;
}

TEST(UploadWishes, ComeAsValuesOrAsTheTextsOfFormFields) {
    for (const char* params :
         {R"({"path":"/a","existing":"skip","name":"n","mtime":5,"names":{"f":"g"},"mtimes":{"f":6}})",
          R"({"path":"/a","existing":"skip","name":"n","mtime":"5","names":"{\"f\":\"g\"}","mtimes":"{\"f\":6}"})"}) {
        UploadWishes wishes;
        ASSERT_EQ(wishes.Read(Parse(params)), nullptr) << params;
        EXPECT_EQ(wishes.Path(), "/a");
        EXPECT_EQ(wishes.WhatIfThere(), Existing::kSkip);
        EXPECT_EQ(wishes.NameFor("other", true), "n");
        EXPECT_EQ(wishes.NameFor("other", false), std::nullopt);
        EXPECT_EQ(wishes.NameFor("f", true), "g");
        EXPECT_EQ(wishes.TimeFor("other", true), 5);
        EXPECT_EQ(wishes.TimeFor("other", false), std::nullopt);
        EXPECT_EQ(wishes.TimeFor("f", false), 6);
    }
}

TEST(UploadWishes, RefuseWhatIsThereUnlessToldOtherwise) {
    UploadWishes wishes;
    ASSERT_EQ(wishes.Read(Parse(R"({"path":"/a"})")), nullptr);
    EXPECT_EQ(wishes.WhatIfThere(), Existing::kRefuse);
    EXPECT_EQ(wishes.NameFor("f", true), std::nullopt);
    EXPECT_EQ(wishes.TimeFor("f", true), std::nullopt);
    ASSERT_EQ(wishes.Read(Parse(R"({"path":"/a","existing":"overwrite"})")), nullptr);
    EXPECT_EQ(wishes.WhatIfThere(), Existing::kOverwrite);
}

TEST(UploadWishes, NameTheParameterThatCannotBeUsed) {
    const std::pair<const char*, const char*> rows[] = {{"path", "7"},
                                                        {"path", "null"},
                                                        {"existing", "\"no\""},
                                                        {"existing", "1"},
                                                        {"existing", "[]"},
                                                        {"name", "7"},
                                                        {"name", "[\"a\"]"},
                                                        {"names", "[]"},
                                                        {"names", "\"x\""},
                                                        {"names", "7"},
                                                        {"names", "{\"f\":7}"},
                                                        {"names", "{\"f\":null}"},
                                                        {"mtime", "-1"},
                                                        {"mtime", "1.5"},
                                                        {"mtime", "\"\""},
                                                        {"mtime", "\"soon\""},
                                                        {"mtime", "true"},
                                                        {"mtime", "253402300800"},
                                                        {"mtimes", "7"},
                                                        {"mtimes", "{\"f\":-1}"},
                                                        {"mtimes", "\"[]\""},
                                                        {"mtimes", "{\"f\":\"x\"}"},
                                                        {"mtimes", "{\"f\":null}"},
                                                        {"mtime", "99999999999999999999"}};
    for (const auto& [name, value] : rows) {
        const std::string path = std::string(name) == "path" ? "" : R"("path":"/a",)";
        EXPECT_EQ(Bad("{" + path + "\"" + name + "\":" + value + "}"), name) << value;
    }
    EXPECT_EQ(Bad("{}"), "path");
    EXPECT_EQ(Bad("[]"), "path");
}

}  // namespace
