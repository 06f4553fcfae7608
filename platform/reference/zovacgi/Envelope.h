#pragma once

#include <string>
#include <string_view>

namespace reference {

/** The parts of an envelope, as views into its bytes. */
struct Envelope {
    std::string_view wrappedKey;
    std::string_view nonce;
    /** Cipher text with the tag behind it. */
    std::string_view sealed;
};

/** Splits the bytes of an envelope. False if they are none of version 1. */
bool SplitEnvelope(std::string_view bytes, Envelope& envelope);

/** Whether the line is one enciphered pair and nothing else; `cipherText` is then its base64url text. */
bool IsEncipheredLine(std::string_view line, std::string_view& cipherText);

/**
 * Deciphers the base64url text of an envelope with the device's key.
 * @return false if it is no envelope, was not made for this device, was changed, or holds a NUL.
 */
bool OpenEnvelope(std::string_view cipherText, std::string& plain);

}  // namespace reference
