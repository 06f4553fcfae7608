#include "Hooks.h"

#include "FakePlatform.h"
#include "webapi/Json.h"

void UnitHook(ZOVA::APIRequest* request, ZOVA::APIResponse* response) {
    const std::string name = Json::asString(request->GetParam("do", ""));
    const auto hook = unit::Hooks().find(name);
    if (hook == unit::Hooks().end()) {
        fake::Unmodelled("a method that does " + name);
    }
    hook->second(request, response);
}

namespace unit {

std::map<std::string, Hook>& Hooks() {
    static std::map<std::string, Hook> hooks;
    return hooks;
}

}  // namespace unit
