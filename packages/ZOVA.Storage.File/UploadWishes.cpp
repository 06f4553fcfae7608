#include "UploadWishes.h"

#include <webapi/Json.h>

#include <algorithm>

namespace package {
namespace {

constexpr const char* kExisting[] = {"error", "skip", "overwrite"};
/** Up to the year 9999. */
constexpr std::int64_t kLatest = 253402300799;

/** A form field's text as the value that it stands for. */
Json::Value Meant(const Json::Value& value) {
    Json::Value parsed;
    return value.isString() && Json::fromString(parsed, value.asString()) ? parsed : value;
}

std::optional<std::int64_t> TimeOf(const Json::Value& value) {
    const Json::Value meant = Meant(value);
    if (!meant.isInt64() || meant.asInt64() < 0 || meant.asInt64() > kLatest) {
        return std::nullopt;
    }
    return meant.asInt64();
}

bool ReadObject(const Json::Value& given, Json::Value& out) {
    if (!given.isNull()) {
        out = Meant(given);
    }
    return out.type() == Json::objectValue;
}

bool AreNames(const Json::Value& names) {
    return std::all_of(names.begin(), names.end(), [](const Json::Value& name) { return name.isString(); });
}

bool AreTimes(const Json::Value& times) {
    return std::all_of(times.begin(), times.end(),
                       [](const Json::Value& time) { return time.isInt64() && TimeOf(time).has_value(); });
}

bool ReadExisting(const Json::Value& given, Existing& out) {
    for (std::size_t at = 0; at < 3; ++at) {
        if (given.isNull() || (given.isString() && given.asString() == kExisting[at])) {
            out = static_cast<Existing>(at);
            return true;
        }
    }
    return false;
}

}  // namespace

const char* UploadWishes::Read(const Json::Value& params) {
    const Json::Value& givenPath = Json::member(params, "path");
    if (!givenPath.isString()) {
        return "path";
    }
    path = givenPath.asString();
    if (!ReadExisting(Json::member(params, "existing"), existing)) {
        return "existing";
    }
    const Json::Value& givenName = Json::member(params, "name");
    if (!givenName.isNull() && !givenName.isString()) {
        return "name";
    }
    name = givenName.isNull() ? std::nullopt : std::optional(givenName.asString());
    if (!ReadObject(Json::member(params, "names"), names) || !AreNames(names)) {
        return "names";
    }
    const Json::Value& givenTime = Json::member(params, "mtime");
    time = TimeOf(givenTime);
    if (!givenTime.isNull() && !time) {
        return "mtime";
    }
    return ReadObject(Json::member(params, "mtimes"), times) && AreTimes(times) ? nullptr : "mtimes";
}

std::optional<std::string> UploadWishes::NameFor(const std::string& field, bool isFirst) const {
    const Json::Value& given = Json::member(names, field);
    if (given.isString()) {
        return given.asString();
    }
    return isFirst ? name : std::nullopt;
}

std::optional<std::int64_t> UploadWishes::TimeFor(const std::string& field, bool isFirst) const {
    const Json::Value& given = Json::member(times, field);
    if (!given.isNull()) {
        return TimeOf(given);
    }
    return isFirst ? time : std::nullopt;
}

Json::Value UploadRow(const std::string& field, const Placed& placed) {
    Json::Value row(Json::objectValue);
    row["field"] = field;
    if (placed.error == FILE_OK) {
        row["size"] = Json::UInt64(placed.size);
        row["skipped"] = placed.isSkipped;
    }
    return row;
}

}  // namespace package
