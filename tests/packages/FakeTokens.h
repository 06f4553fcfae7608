#pragma once

#include <string>
#include <vector>

/** The access tokens of the platform: answers what a test sets, and notes what it was asked. Renewed by each test. */
struct FakeTokens {
    /** What the next operation answers, a ZovaAccessTokenResult. */
    int result = 0;
    /** Each operation with its arguments. */
    std::vector<std::string> calls;

    static FakeTokens& Instance();
    static FakeTokens& Renew();
};
