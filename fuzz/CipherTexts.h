#pragma once

namespace fuzz {

/** Everything that was ever enciphered with the fixed keys: nothing else may come out of a cipher text. */
constexpr const char* kClearTexts[] = {
    "",
    "api=ZOVA.Core.Session&version=1&method=login&account=alice&passwd=secret",
    "a=%zz&b=%&c=1e999&=&d=[[[]]]&__nEkOtReHpIc=t&__tXeTrEhPiC=c",
};

/** The token of the enciphered parameter pairs. */
constexpr const char* kToken = "token";

}  // namespace fuzz
