// A template, on the first line, and the JSON answer that it is laid over, beside a second and plainer reading.

#include <vector>

#include "Check.h"
#include "JsonRoundTrip.h"
#include "Target.h"
#include "webapi/APIUtils.h"
#include "webapi/Json.h"

namespace {

struct Place {
    std::vector<std::string> path;
    std::string name;
};

/** The places of a template in their order, whatever the source holds there. */
void Collect(const Json::Value& templateValue, const std::vector<std::string>& path, std::vector<Place>& places) {
    if (templateValue.type() == Json::stringValue) {
        const std::string text = Json::asString(templateValue);
        const bool named = text.size() > 1 && text[0] == '{' && text.find('}') + 1 == text.size();
        if (named && !path.empty()) {
            places.push_back({path, text.substr(1, text.size() - 2)});
        }
    } else if (templateValue.type() == Json::objectValue) {
        for (const std::string& member : templateValue.getMemberNames()) {
            std::vector<std::string> longer = path;
            longer.push_back(member);
            Collect(templateValue[member], longer, places);
        }
    }
}

const Json::Value* Find(const Json::Value& source, const std::vector<std::string>& path) {
    const Json::Value* value = &source;
    for (const std::string& member : path) {
        if (!Json::hasMember(*value, member)) {
            return nullptr;
        }
        value = &Json::member(*value, member);
    }
    return value;
}

Json::Value PlainReading(const Json::Value& source, const Json::Value& templateValue) {
    std::vector<Place> places;
    Collect(templateValue, {}, places);
    Json::Value output;
    for (const Place& place : places) {
        if (const Json::Value* value = Find(source, place.path)) {
            output[place.name] = *value;
        }
    }
    return output;
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::string text = fuzz::TextOf(data, size);
    const size_t end = std::min(text.find('\n'), text.size());
    Json::Value templateValue;
    Json::Value source;
    if (!Json::fromString(templateValue, text.substr(0, end)) ||
        !Json::fromString(source, text.substr(std::min(end + 1, text.size())))) {
        return 0;
    }
    Json::Value output;
    FUZZ_CHECK(ZOVA::APIUtils::ResolveJson(source, templateValue, output));
    FUZZ_CHECK(output == PlainReading(source, templateValue));
    fuzz::CheckRoundTrip(output);

    // What was there before stays, but for an output that is no object.
    Json::Value filled(Json::objectValue);
    filled["before"] = source;
    FUZZ_CHECK(ZOVA::APIUtils::ResolveJson(source, templateValue, filled));
    FUZZ_CHECK(filled["before"] == (Json::hasMember(output, "before") ? output["before"] : source));
    Json::Value odd = 5;
    FUZZ_CHECK(ZOVA::APIUtils::ResolveJson(source, templateValue, odd));
    FUZZ_CHECK(odd == (output.isNull() ? Json::Value(5) : output));
    return 0;
}
