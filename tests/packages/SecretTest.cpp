#include "../../packages/common/Secret.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>

namespace {

TEST(Secret, WipesTheTextItTakesOver) {
    std::string source = "a password that is too long for the short form of a string";
    const char* bytes = source.data();
    package::Secret secret;
    secret.Take(std::move(source));
    EXPECT_EQ(secret.Text(), "a password that is too long for the short form of a string");
    // The source keeps its memory, now holding zeros.
    EXPECT_EQ(std::string(bytes, 10), std::string(10, '\0'));
}

TEST(Secret, ReplacesWhatItHeld) {
    package::Secret secret(std::string("first"));
    secret.Take(std::string("second"));
    EXPECT_EQ(secret.Text(), "second");
}

}  // namespace
