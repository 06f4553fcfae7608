#include <webapi/APITable.h>

#include "TaskMethods.h"

namespace {

constexpr char kApi[] = "ZOVA.Core.Task";

const ZOVA::_tag_API_TABLE kTable[] = {
    {kApi, 1, "status", package::TaskStatus},
    {kApi, 1, "stop", package::StopTask},
    {kApi, 1, "list", package::ListTasks},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
