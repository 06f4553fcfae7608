#include "taskmanager/TaskRecord.h"

#include <ctime>
#include <limits>

#include "common/JsonText.h"

namespace reference {

namespace {

constexpr int kFormat = 1;
constexpr Json::ArrayIndex kMembers = 9;

/** A member that is a whole number from 0 to `highest`. */
bool ReadNumber(const Json::Value& document, const char* name, std::uint64_t highest, std::uint64_t& value) {
    const Json::Value& number = document[name];
    if (number.type() == Json::realValue || !number.isUInt64() || number.asUInt64() > highest) {
        return false;
    }
    value = number.asUInt64();
    return true;
}

bool ReadBool(const Json::Value& document, const char* name, bool& value) {
    if (!document[name].isBool()) {
        return false;
    }
    value = document[name].asBool();
    return true;
}

}  // namespace

bool TaskRecord::IsExpired(std::uint64_t now) const {
    return finished && removed && (now < removedAt || now - removedAt >= kTaskKeptSeconds);
}

bool ParseTaskRecord(std::string_view text, const TaskKey& key, TaskRecord& record) {
    Json::Value parsed;
    if (text.size() > kLargestTaskRecord || !ParseJson(text, parsed) || parsed.type() != Json::objectValue ||
        parsed.size() != kMembers) {
        return false;
    }
    const Json::Value& document = parsed;
    TaskRecord read;
    std::uint64_t format = 0;
    std::uint64_t pid = 0;
    if (!ReadNumber(document, "format", kFormat, format) || format != kFormat ||
        JsonTextMember(document, "owner") != key.owner || JsonTextMember(document, "id") != key.id ||
        !ReadNumber(document, "pid", std::numeric_limits<int>::max(), pid) ||
        !ReadNumber(document, "process_start", std::numeric_limits<std::uint64_t>::max(), read.processStart) ||
        !ReadBool(document, "finished", read.finished) || !ReadBool(document, "removed", read.removed) ||
        !ReadNumber(document, "removed_at", std::numeric_limits<std::uint64_t>::max(), read.removedAt) ||
        document["properties"].type() != Json::objectValue) {
        return false;
    }
    read.pid = static_cast<int>(pid);
    read.properties.swap(parsed["properties"]);
    record = std::move(read);
    return true;
}

std::string WriteTaskRecord(const TaskKey& key, const TaskRecord& record) {
    Json::Value document(Json::objectValue);
    document["format"] = kFormat;
    document["owner"] = key.owner;
    document["id"] = key.id;
    document["pid"] = record.pid;
    document["process_start"] = Json::UInt64(record.processStart);
    document["finished"] = record.finished;
    document["removed"] = record.removed;
    document["removed_at"] = Json::UInt64(record.removedAt);
    document["properties"] = record.properties;
    return WriteJson(document);
}

std::uint64_t SecondsSinceBoot() {
    struct timespec now;
    clock_gettime(CLOCK_BOOTTIME, &now);
    return static_cast<std::uint64_t>(now.tv_sec);
}

}  // namespace reference
