#pragma once

// libwebapi.so: text utilities.

#include <json/value.h>

#include <string>

struct ZovaSzHash;

namespace ZOVA {

class WebAPIUtil {
public:
    /** Elements between the separator characters, without blanks around them, as a JSON array of texts. */
    static Json::Value ParseToArray(const char* text, const char* separators);

    /** Resolves percent escapes; a broken one stays as it is. `keepPlus` false also turns "+" into a blank. */
    static std::string URLDecode(const std::string& text, bool keepPlus);

    /** Percent-encodes everything but letters, digits, "-", "_", "." and "~". */
    static std::string URLEncode(const std::string& text);

    /**
     * Parses "name=value&name=value" into members of `out`; a later pair of the same name wins.
     * @param typed a value whose whole text is a JSON value becomes it, all else is text.
     * @param decode names and values are percent- and plus-decoded first.
     * @return false if `out` is neither an object nor null.
     */
    static bool strPairToJsonObj(const std::string& pairs, Json::Value& out, bool typed, bool decode);

    /** Adds every pair of the hash to `out`, as texts. False if `hash` is null or `out` neither an object nor null. */
    static bool SzHashToJsonObj(ZovaSzHash* hash, Json::Value& out);

    /** Reads a JSON file. False if it cannot be read or parsed; `out` is then left alone. */
    static bool ReadJsonFile(Json::Value& out, const char* path);
};

}  // namespace ZOVA
