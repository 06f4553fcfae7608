#pragma once

// What the packages import from libwebapi.so.

#include <json/value.h>

#include <string>

namespace ZOVA {

class WebAPIUtil {
public:
    /**
     * Parses "name=value&name=value" into members of `out`; a later pair of the same name wins.
     * @param typed a value whose whole text is a JSON value becomes it, all else is text.
     * @param decode names and values are percent- and plus-decoded first.
     * @return false if `out` is neither an object nor null.
     */
    static bool strPairToJsonObj(const std::string& pairs, Json::Value& out, bool typed, bool decode);
};

}  // namespace ZOVA
