// A project's check library.

#include <unistd.h>

#include <stdexcept>
#include <string>

#include "Marks.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APITable.h"

using ZOVA::APIRequest;
using ZOVA::APIResponse;

namespace {

void Tell(const std::string& verdict) {
    uid_t real = 0;
    uid_t effective = 0;
    uid_t saved = 0;
    gid_t group = 0;
    gid_t effectiveGroup = 0;
    gid_t savedGroup = 0;
    getresuid(&real, &effective, &saved);
    getresgid(&group, &effectiveGroup, &savedGroup);
    UnitMark((verdict + " as " + std::to_string(effective) + "/" + std::to_string(effectiveGroup) + " in [" +
              UnitHat() + "]")
                 .c_str());
}

bool Agree(APIRequest*, APIResponse*) {
    Tell("yes");
    return true;
}

bool Refuse(APIRequest*, APIResponse*) {
    Tell("no");
    return false;
}

bool RefuseWithError(APIRequest*, APIResponse* response) {
    response->SetError(777, Json::Value());
    return false;
}

bool Throw(APIRequest*, APIResponse*) {
    throw std::runtime_error("a check\nthat fails");
}

bool ThrowInt(APIRequest*, APIResponse*) {
    throw 1;
}

const ZOVA::_tag_API_SHARING_CHECK_TABLE table[] = {
    {"^ZOVA[.]Test[.]Good$", 0, "^success$", Agree},
    {"*", 0, "^refused$", Refuse},
    {"*", 0, "^refused_with_error$", RefuseWithError},
    {"*", 0, "^throws$", Throw},
    {"*", 0, "^throws_int$", ThrowInt},
    {"*", 0, "^no_function$", nullptr},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_SHARING_CHECK_TABLE* GetAPISharingCheckTable() {
    return table;
}
