// A library whose methods are what the test says.

#include "Hooks.h"
#include "webapi/APITable.h"

namespace {

const ZOVA::_tag_API_TABLE table[] = {
    {"ZOVA.Test.Hook", 1, "local", UnitHook},
    {"ZOVA.Test.Hook", 1, "child", UnitHook},
    {"ZOVA.Test.Hook", 1, "by_default", UnitHook},
    {"ZOVA.Test.Hook", 1, "upload", UnitHook},
    {"ZOVA.Test.Hook", 1, "download", UnitHook},
    {"ZOVA.Test.Hook", 1, "gated", UnitHook},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return table;
}
