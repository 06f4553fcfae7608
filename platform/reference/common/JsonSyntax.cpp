#include "common/JsonSyntax.h"

#include <bitset>

namespace reference {

namespace {

/** Walks over a text from token to token. All members leave the position behind what they accepted. */
class Scanner {
public:
    explicit Scanner(std::string_view text) : at(text.data()), end(text.data() + text.size()) {}

    bool Document() {
        if (!Value()) {
            return false;
        }
        SkipBlanks();
        return at == end;
    }

private:
    /** One value with all that is nested in it: containers are kept on a stack of bits, not of calls. */
    bool Value() {
        do {
            SkipBlanks();
            if (at == end) {
                return false;
            }
            if (*at == '[' || *at == '{') {
                if (!OpenContainer()) {
                    return false;
                }
                continue;
            }
            if (!Scalar() || !Continue()) {
                return false;
            }
        } while (depth > 0);
        return true;
    }

    bool OpenContainer() {
        if (depth == kJsonDepth) {
            return false;
        }
        const bool isObject = *at++ == '{';
        objects[depth++] = isObject;
        SkipBlanks();
        if (Accept(isObject ? '}' : ']')) {
            --depth;
            return Continue();
        }
        return !isObject || Name();
    }

    /** Behind a value: closes containers and steps over one comma, to where the next value is expected, if any. */
    bool Continue() {
        while (depth > 0) {
            SkipBlanks();
            const bool isObject = objects[depth - 1];
            if (Accept(',')) {
                return !isObject || Name();
            }
            if (!Accept(isObject ? '}' : ']')) {
                return false;
            }
            --depth;
        }
        return true;
    }

    bool Name() {
        SkipBlanks();
        if (at == end || *at != '"' || !Text()) {
            return false;
        }
        SkipBlanks();
        return Accept(':');
    }

    bool Scalar() {
        switch (*at) {
            case '"':
                return Text();
            case 't':
                return Word("true");
            case 'f':
                return Word("false");
            case 'n':
                return Word("null");
            default:
                return Number();
        }
    }

    bool Word(std::string_view word) {
        if (std::string_view(at, static_cast<size_t>(end - at)).substr(0, word.size()) != word) {
            return false;
        }
        at += word.size();
        return true;
    }

    bool Number() {
        Accept('-');
        if (!Accept('0') && !Digits()) {
            return false;
        }
        if (Accept('.') && !Digits()) {
            return false;
        }
        if (Accept('e') || Accept('E')) {
            if (!Accept('+')) {
                Accept('-');
            }
            return Digits();
        }
        return true;
    }

    bool Digits() {
        const char* const start = at;
        while (at != end && *at >= '0' && *at <= '9') {
            ++at;
        }
        return at != start;
    }

    bool Text() {
        for (++at; at != end; ++at) {
            const auto byte = static_cast<unsigned char>(*at);
            if (byte == '"') {
                ++at;
                return true;
            }
            if (byte < 0x20 || (byte == '\\' && !Escape())) {
                return false;
            }
        }
        return false;
    }

    /** From the backslash to the last byte of the escape. */
    bool Escape() {
        if (++at == end) {
            return false;
        }
        if (*at != 'u') {
            return std::string_view("\"\\/bfnrt").find(*at) != std::string_view::npos;
        }
        for (int i = 0; i < 4; ++i) {
            if (++at == end || std::string_view("0123456789abcdefABCDEF").find(*at) == std::string_view::npos) {
                return false;
            }
        }
        return true;
    }

    bool Accept(char byte) {
        if (at == end || *at != byte) {
            return false;
        }
        ++at;
        return true;
    }

    void SkipBlanks() {
        while (at != end && (*at == ' ' || *at == '\t' || *at == '\n' || *at == '\r')) {
            ++at;
        }
    }

    const char* at;
    const char* end;
    std::bitset<kJsonDepth> objects;
    int depth = 0;
};

}  // namespace

bool IsJsonText(std::string_view text) {
    return Scanner(text).Document();
}

}  // namespace reference
