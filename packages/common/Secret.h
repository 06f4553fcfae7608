#pragma once

#include <string.h>

#include <string>
#include <utility>

namespace package {

/** A text that is wiped from memory when it goes: a password or a session id. Not copied, so that one wipe is enough.
 */
class Secret {
public:
    Secret() = default;
    explicit Secret(std::string&& source) { Take(std::move(source)); }
    Secret(const Secret&) = delete;
    Secret& operator=(const Secret&) = delete;
    ~Secret() { Wipe(); }

    /** Takes the text over and wipes the source. */
    void Take(std::string&& source) {
        Wipe();
        text = source;
        explicit_bzero(source.data(), source.size());
        source.clear();
    }
    const std::string& Text() const { return text; }
    const char* c_str() const { return text.c_str(); }
    bool Empty() const { return text.empty(); }

private:
    void Wipe() {
        explicit_bzero(text.data(), text.size());
        text.clear();
    }

    std::string text;
};

/** A buffer of the stack for what the platform writes out, wiped when it goes. */
template <int Size>
class SecretBuffer {
public:
    SecretBuffer() = default;
    SecretBuffer(const SecretBuffer&) = delete;
    SecretBuffer& operator=(const SecretBuffer&) = delete;
    ~SecretBuffer() { explicit_bzero(data, Size); }

    char* Data() { return data; }
    const char* c_str() const { return data; }
    static constexpr int kSize = Size;

private:
    char data[Size] = {};
};

}  // namespace package
