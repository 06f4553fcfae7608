#include <webapi/APITable.h>

#include "Caller.h"
#include "ChangeNames.h"
#include "Delete.h"
#include "Download.h"
#include "ListFolder.h"
#include "Upload.h"
#include "UploadDeferred.h"

namespace {

constexpr char kApi[] = "ZOVA.Storage.File";

const ZOVA::_tag_API_TABLE kTable[] = {
    {kApi, 1, "list", package::ListFolder},
    {kApi, 1, "stat", package::StatPaths},
    {kApi, 1, "mkdir", package::MakeFolder},
    {kApi, 1, "rename", package::Rename},
    {kApi, 1, "delete", package::Delete},
    {kApi, 1, "upload", package::Upload},
    {kApi, 1, "upload_deferred", package::UploadDeferred},
    {kApi, 1, "download", package::Download},
    {nullptr, 0, nullptr, nullptr},
};

const ZOVA::_tag_API_CHECK_TABLE kChecks[] = {
    {kApi, 1, "list", package::PrepareCall, nullptr, nullptr},
    {kApi, 1, "stat", package::PrepareCall, nullptr, nullptr},
    {kApi, 1, "mkdir", package::PrepareCall, nullptr, nullptr},
    {kApi, 1, "rename", package::PrepareCall, nullptr, nullptr},
    {kApi, 1, "delete", package::PrepareCall, nullptr, nullptr},
    {kApi, 1, "upload", package::PrepareCall, nullptr, nullptr},
    {kApi, 1, "upload_deferred", package::PrepareCall, nullptr, nullptr},
    {kApi, 1, "download", package::PrepareCall, nullptr, nullptr},
    {nullptr, 0, nullptr, nullptr, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_CHECK_TABLE* GetAPICheckTable() {
    return kChecks;
}
