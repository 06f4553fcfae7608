#include "webapi/ExecParam.h"

#include "webapi/APIBase.h"
#include "webapi/Json.h"

namespace ZOVA {

class ExecParamPrivate : public APIBase {
public:
    ExecParamPrivate() { InitSections(); }
    ExecParamPrivate(const ExecParamPrivate&) = default;
    ExecParamPrivate& operator=(const ExecParamPrivate&) = default;
    ~ExecParamPrivate() override = default;

    void InitSections() {
        if (data.type() != Json::objectValue) {
            data = Json::Value(Json::objectValue);
        }
        for (const char* section : {"params", "env", "attr", "runner", "output"}) {
            InitField(section);
        }
    }

    Json::Value Object(const char* section) const { return GetData(section, Json::Value(Json::objectValue)); }
};

ExecParam::ExecParam() : d(new ExecParamPrivate()) {}

ExecParam::ExecParam(const ExecParam& other) : d(new ExecParamPrivate(*other.d)) {}

ExecParam::ExecParam(Json::Value& store) : d(new ExecParamPrivate()) {
    d->Deserialize(store);
    d->InitSections();
}

ExecParam& ExecParam::operator=(const ExecParam& other) {
    *d = *other.d;
    return *this;
}

ExecParam::~ExecParam() {
    delete d;
}

const Json::Value& ExecParam::Serialize() const {
    return d->Serialize();
}

void ExecParam::Deserialize(Json::Value& store) {
    d->Deserialize(store);
}

ExecParam& ExecParam::SetParams(const Json::Value& params) {
    d->SetData("params", params, false);
    return *this;
}

ExecParam& ExecParam::SetAPI(const std::string& api) {
    d->SetData("params", "api", api, false);
    return *this;
}

ExecParam& ExecParam::SetVersion(int version) {
    d->SetData("params", "version", version, false);
    return *this;
}

ExecParam& ExecParam::SetMethod(const std::string& method) {
    d->SetData("params", "method", method, false);
    return *this;
}

ExecParam& ExecParam::SetEnv(const Json::Value& env) {
    d->SetData("env", env, false);
    return *this;
}

ExecParam& ExecParam::SetRunner(const std::string& user) {
    d->SetData("runner", "username", user, false);
    return *this;
}

ExecParam& ExecParam::SetAttr(const Json::Value& attr) {
    d->SetData("attr", attr, false);
    return *this;
}

ExecParam& ExecParam::SetOutputFd(int fd) {
    d->SetData("output", "fd", fd, false);
    return *this;
}

std::string ExecParam::GetAPI() const {
    return Json::asString(d->GetData("params", "api", ""));
}

int ExecParam::GetVersion() const {
    return Json::asInt(d->GetData("params", "version", 0));
}

std::string ExecParam::GetMethod() const {
    return Json::asString(d->GetData("params", "method", ""));
}

Json::Value ExecParam::GetParams() const {
    return d->Object("params");
}

Json::Value ExecParam::GetEnv() const {
    return d->Object("env");
}

std::string ExecParam::GetRunner() const {
    return Json::asString(d->GetData("runner", "username", ""));
}

Json::Value ExecParam::GetAttr() const {
    return d->Object("attr");
}

int ExecParam::GetOutputFd() const {
    return Json::asInt(d->GetData("output", "fd", -1));
}

}  // namespace ZOVA
