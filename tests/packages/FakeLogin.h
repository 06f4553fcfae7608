#pragma once

#include <map>
#include <set>
#include <string>
#include <vector>

/**
 * The login operations of the platform, with state that a test sets. One object, renewed by each test: sessions are
 * bound to their address and, if they have one, to their token.
 */
struct FakeLogin {
    struct Session {
        std::string user;
        std::string address;
        std::string token;
        bool timedOut = false;
    };

    std::map<std::string, std::string> passwords;
    std::set<std::string> administrators;
    std::set<std::string> blockedAddresses;
    std::map<std::string, Session> sessions;
    std::string publicKey = "TUZrd0V3";
    bool passwordCheckFails = false;
    bool createFails = false;
    bool removeFails = false;
    /** Account and address of each password check. */
    std::vector<std::string> checks;
    int created = 0;

    static FakeLogin& Instance();
    static FakeLogin& Renew();
};
