// Writes enciphered seeds: fuzz_cipher_seeds FOLDER. Enciphers each clear text as a browser would, as an envelope line
// and as the cipher text of a parameter pair, with the fixed keys.

#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/rand.h>
#include <openssl/rsa.h>

#include <cstdio>
#include <fstream>
#include <string>
#include <vector>

#include "Check.h"
#include "CipherTexts.h"
#include "common/Crypto.h"
#include "common/DeviceKeys.h"
#include "zovacloudservice.h"

namespace {

using reference::crypto::kKeySize;
using reference::crypto::kNonceSize;
using reference::crypto::kTagSize;

const unsigned char* Bytes(const std::string& text) {
    return reinterpret_cast<const unsigned char*>(text.data());
}
unsigned char* Bytes(std::string& text) {
    return reinterpret_cast<unsigned char*>(text.data());
}

std::string Random(size_t size) {
    std::string bytes(size, '\0');
    FUZZ_CHECK(RAND_bytes(Bytes(bytes), static_cast<int>(size)) == 1);
    return bytes;
}

std::string Base64(const std::string& bytes, bool urlSafe) {
    std::string text(4 * ((bytes.size() + 2) / 3) + 1, '\0');
    text.resize(static_cast<size_t>(EVP_EncodeBlock(Bytes(text), Bytes(bytes), static_cast<int>(bytes.size()))));
    if (urlSafe) {
        text.erase(text.find_last_not_of('=') + 1);
        for (char& byte : text) {
            byte = byte == '+' ? '-' : byte == '/' ? '_' : byte;
        }
    }
    return text;
}

/** Nonce, cipher text and tag. */
std::string Seal(const std::string& key, const std::string& additional, const std::string& clear) {
    const std::string nonce = Random(kNonceSize);
    std::string cipherText(clear.size(), '\0');
    std::string tag(kTagSize, '\0');
    int length = 0;
    EVP_CIPHER_CTX* context = EVP_CIPHER_CTX_new();
    FUZZ_CHECK(EVP_EncryptInit_ex(context, EVP_aes_256_gcm(), nullptr, Bytes(key), Bytes(nonce)) == 1);
    if (!additional.empty()) {
        const int size = static_cast<int>(additional.size());
        FUZZ_CHECK(EVP_EncryptUpdate(context, nullptr, &length, Bytes(additional), size) == 1);
    }
    if (!clear.empty()) {
        const int size = static_cast<int>(clear.size());
        FUZZ_CHECK(EVP_EncryptUpdate(context, Bytes(cipherText), &length, Bytes(clear), size) == 1);
    }
    FUZZ_CHECK(EVP_EncryptFinal_ex(context, Bytes(tag), &length) == 1);
    FUZZ_CHECK(EVP_CIPHER_CTX_ctrl(context, EVP_CTRL_GCM_GET_TAG, kTagSize, tag.data()) == 1);
    EVP_CIPHER_CTX_free(context);
    return nonce + cipherText + tag;
}

std::string WrapKey(const std::string& key) {
    std::string pem;
    FUZZ_CHECK(reference::ReadEnvelopeKey(pem));
    BIO* stream = BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size()));
    EVP_PKEY* rsa = PEM_read_bio_PrivateKey(stream, nullptr, nullptr, nullptr);
    EVP_PKEY_CTX* context = EVP_PKEY_CTX_new(rsa, nullptr);
    FUZZ_CHECK(EVP_PKEY_encrypt_init(context) == 1);
    FUZZ_CHECK(EVP_PKEY_CTX_set_rsa_padding(context, RSA_PKCS1_OAEP_PADDING) == 1);
    FUZZ_CHECK(EVP_PKEY_CTX_set_rsa_oaep_md(context, EVP_sha256()) == 1);
    std::string wrapped(static_cast<size_t>(EVP_PKEY_size(rsa)), '\0');
    size_t length = wrapped.size();
    FUZZ_CHECK(EVP_PKEY_encrypt(context, Bytes(wrapped), &length, Bytes(key), key.size()) == 1);
    EVP_PKEY_CTX_free(context);
    EVP_PKEY_free(rsa);
    BIO_free(stream);
    return wrapped;
}

std::string EnvelopeLine(const std::string& clear) {
    const std::string key = Random(kKeySize);
    const std::string wrapped = WrapKey(key);
    std::string bytes = {'\1', static_cast<char>(wrapped.size() >> 8), static_cast<char>(wrapped.size() & 255)};
    bytes += wrapped + Seal(key, "zova-envelope-1", clear);
    return "__cIpHeRtExT=" + Base64(bytes, true);
}

std::string PairCipherText(const std::string& clear) {
    char key[kKeySize + 1];
    FUZZ_CHECK(ZOVACloudServiceZntokenGenerateToken(fuzz::kToken, key, sizeof(key)) == 0);
    return Base64(Seal(key, "", clear), false);
}

void Write(const std::string& path, const std::string& text) {
    std::ofstream file(path, std::ios::binary);
    file << text;
    file.close();
    FUZZ_CHECK(file.good());
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        fprintf(stderr, "usage: %s FOLDER\n", argv[0]);
        return 2;
    }
    const std::string folder = std::string(argv[1]) + "/";
    int number = 0;
    for (const char* clear : fuzz::kClearTexts) {
        ++number;
        Write(folder + "envelope-" + std::to_string(number), EnvelopeLine(clear));
        Write(folder + "pair-" + std::to_string(number), PairCipherText(clear));
    }
    return 0;
}
