#pragma once

// libzovacredential.so.6: requests to peer devices and their ciphers.

#include <string>

namespace ZOVA {

class CredRequestUtil {
public:
    /** AES deciphering with the key text; false on failure, `plain` is then left alone. */
    static bool GetDecryptAESString(const std::string& key, const std::string& cipherText, std::string& plain);
};

}  // namespace ZOVA
