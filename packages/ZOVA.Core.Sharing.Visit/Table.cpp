#include <webapi/APITable.h>

#include "OpenLink.h"

namespace {

constexpr char kApi[] = "ZOVA.Core.Sharing.Visit";

const ZOVA::_tag_API_TABLE kTable[] = {
    {kApi, 1, "open", package::OpenLink},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable() {
    return kTable;
}
