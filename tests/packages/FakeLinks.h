#pragma once

#include <string>
#include <vector>

/** The sharing links of the platform: answers what a test sets, and notes what it was asked. Renewed by each test. */
struct FakeLinks {
    /** What the next operation answers, a ZovaLinkResult. */
    int result = 0;
    /** Session that "open" makes. */
    std::string sid = "5e55";
    /** Each operation with its arguments. */
    std::vector<std::string> calls;

    static FakeLinks& Instance();
    static FakeLinks& Renew();
};
