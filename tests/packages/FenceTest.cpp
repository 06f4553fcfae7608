#include "../../packages/common/Fence.h"

#include <gtest/gtest.h>
#include <webapi/APIRequest.h>
#include <webapi/Json.h>

#include <stdexcept>

namespace {

TEST(Fence, LetsAnAnswerThrough) {
    ZOVA::APIRequest request{Json::Value()};
    ZOVA::APIResponse answer(&request);
    package::Fenced("test", &answer, [&] { answer.SetSuccess(7); });
    EXPECT_EQ(Json::toString(answer.GetBody()), R"({"data":7,"success":true})");
}

TEST(Fence, AnswersAnInternalErrorForAnException) {
    ZOVA::APIRequest request{Json::Value()};
    ZOVA::APIResponse answer(&request);
    package::Fenced("test", &answer, [&] {
        answer.SetSuccess(7);
        throw std::runtime_error("on purpose");
    });
    EXPECT_EQ(Json::toString(answer.GetBody()), R"({"error":{"code":117},"success":false})");
}

TEST(Fence, AnswersAnInternalErrorForWhatIsNoException) {
    ZOVA::APIRequest request{Json::Value()};
    ZOVA::APIResponse answer(&request);
    package::Fenced("test", &answer, [] { throw 7; });
    EXPECT_EQ(answer.GetError(), 117);
}

}  // namespace
