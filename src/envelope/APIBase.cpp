#include "webapi/APIBase.h"

#include "webapi/Json.h"

namespace ZOVA {

APIBase::APIBase() : data(Json::objectValue) {}

APIBase::~APIBase() = default;

const Json::Value* APIBase::Section(const std::string& section) const {
    const Json::Value& found = Json::member(data, section);
    return found.type() == Json::objectValue ? &found : nullptr;
}

Json::Value* APIBase::Section(const std::string& section) {
    return const_cast<Json::Value*>(static_cast<const APIBase*>(this)->Section(section));
}

bool APIBase::InitField(const std::string& section) {
    if (section.empty() || data.type() != Json::objectValue || Json::hasMember(data, section)) {
        return false;
    }
    data[section] = Json::Value(Json::objectValue);
    return true;
}

bool APIBase::HasData(const std::string& section, const std::string& key) const {
    const Json::Value* found = Section(section);
    return found != nullptr && Json::hasMember(*found, key);
}

const Json::Value& APIBase::GetData(const std::string& section, const std::string& key,
                                    const Json::Value& fallback) const {
    const Json::Value* found = Section(section);
    if (found == nullptr) {
        return fallback;
    }
    if (key.empty()) {
        return *found;
    }
    const Json::Value* value = found->find(key.data(), key.data() + key.size());
    return value == nullptr ? fallback : *value;
}

const Json::Value& APIBase::GetData(const std::string& section, const Json::Value& fallback) const {
    return GetData(section, "", fallback);
}

bool APIBase::SetData(const std::string& section, const std::string& key, const Json::Value& value, bool onlyString) {
    Json::Value* found = Section(section);
    if (found == nullptr || key.empty() || (onlyString && !value.isString())) {
        return false;
    }
    (*found)[key] = value;
    return true;
}

bool APIBase::SetData(const std::string& section, const Json::Value& object, bool onlyString) {
    Json::Value* found = Section(section);
    if (found == nullptr || object.type() != Json::objectValue || object.empty()) {
        return false;
    }
    for (auto member = object.begin(); member != object.end(); ++member) {
        if (!onlyString || member->isString()) {
            (*found)[member.name()] = *member;
        }
    }
    return true;
}

bool APIBase::ClearData(const std::string& section, const std::string& key) {
    Json::Value* found = Section(section);
    if (section.empty() || found == nullptr) {
        return false;
    }
    if (key.empty()) {
        found->clear();
        return true;
    }
    return found->removeMember(key, nullptr);
}

const Json::Value& APIBase::Serialize() const {
    return data;
}

void APIBase::Deserialize(Json::Value& in) {
    data.swap(in);
}

}  // namespace ZOVA
