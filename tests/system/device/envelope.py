"""Enciphers a parameter line for the device, as a browser does with WebCrypto: RSA-OAEP with SHA-256 around the key of
AES-256-GCM. The block cipher and RSA are openssl's; what its command lacks of GCM is made here."""

import base64
import os
import struct
import subprocess
import tempfile

ADDITIONAL = b"zova-envelope-1"


def _openssl(*arguments, data=b""):
    return subprocess.run(["openssl", *arguments], input=data, capture_output=True, check=True).stdout


def _times(left, right):
    """Product in the field of GCM, whose bits stand in reverse order."""
    product = 0
    for bit in range(127, -1, -1):
        if right >> bit & 1:
            product ^= left
        left = left >> 1 ^ (0xE1 << 120 if left & 1 else 0)
    return product


def _blocks(data):
    for start in range(0, len(data), 16):
        yield int.from_bytes(data[start:start + 16].ljust(16, b"\0"), "big")


def _ghash(subkey, additional, cipher_text):
    value = 0
    lengths = struct.pack(">QQ", len(additional) * 8, len(cipher_text) * 8)
    for part in (additional, cipher_text, lengths):
        for block in _blocks(part):
            value = _times(value ^ block, subkey)
    return value


def seal(key, nonce, plain, additional=ADDITIONAL):
    """AES-256-GCM: cipher text and tag."""
    subkey = int.from_bytes(_openssl("enc", "-aes-256-ecb", "-nopad", "-K", key.hex(), data=bytes(16)), "big")
    # The counter starts at 1: its first block hides the tag.
    stream = _openssl("enc", "-aes-256-ctr", "-K", key.hex(), "-iv", (nonce + b"\0\0\0\1").hex(),
                      data=bytes(16) + plain)
    cipher_text = stream[16:]
    tag = int.from_bytes(stream[:16], "big") ^ _ghash(subkey, additional, cipher_text)
    return cipher_text + tag.to_bytes(16, "big")


def make(public_key, line):
    """The line of one enciphered pair. `public_key` is base64 of a SubjectPublicKeyInfo."""
    key, nonce = os.urandom(32), os.urandom(12)
    with tempfile.NamedTemporaryFile() as file:
        file.write(base64.b64decode(public_key))
        file.flush()
        wrapped = _openssl("pkeyutl", "-encrypt", "-pubin", "-inkey", file.name, "-keyform", "DER", "-pkeyopt",
                           "rsa_padding_mode:oaep", "-pkeyopt", "rsa_oaep_md:sha256", data=key)
    envelope = b"\1" + struct.pack(">H", len(wrapped)) + wrapped + nonce + seal(key, nonce, line)
    return b"__cIpHeRtExT=" + base64.urlsafe_b64encode(envelope).rstrip(b"=")
