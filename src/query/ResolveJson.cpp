#include "webapi/APIUtils.h"
#include "webapi/Json.h"

namespace ZOVA::APIUtils {

namespace {

/** Whether the text is a name between braces. */
bool IsPlaceholder(const std::string& text) {
    return text.size() >= 2 && text.front() == '{' && text.find('}') == text.size() - 1;
}

void Store(Json::Value& output, const std::string& name, const Json::Value& value) {
    if (!Json::isObject(output)) {
        output = Json::Value(Json::objectValue);
    }
    output[name] = value;
}

}  // namespace

bool ResolveJson(const Json::Value& source, const Json::Value& templateValue, Json::Value& output) {
    if (!Json::isObject(templateValue)) {
        return true;
    }
    for (auto place = templateValue.begin(); place != templateValue.end(); ++place) {
        if (!Json::hasMember(source, place.name())) {
            continue;
        }
        const Json::Value& value = source[place.name()];
        if (place->type() == Json::objectValue) {
            ResolveJson(value, *place, output);
        } else if (place->isString()) {
            const std::string text = Json::asString(*place);
            if (IsPlaceholder(text)) {
                Store(output, text.substr(1, text.size() - 2), value);
            }
        }
    }
    return true;
}

}  // namespace ZOVA::APIUtils
