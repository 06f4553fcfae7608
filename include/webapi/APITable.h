#pragma once

#include "Export.h"

namespace ZOVA {

class APIRequest;
class APIResponse;

/** A method: reads its parameters from the request and answers through the response. */
using APIMethodFunc = void (*)(APIRequest*, APIResponse*);

/** A check in front of a method: true lets the call go on; one that refuses has to set the error itself. */
using APICheckFunc = bool (*)(APIRequest*, APIResponse*);

/**
 * One row of the table that an API library gives out through
 *
 *     WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_TABLE* GetAPITable();
 *
 * The table is static data of the library and ends with a row whose `api` is null. The first row that fits serves.
 */
struct _tag_API_TABLE {
    const char* api;
    int version;
    const char* method;
    APIMethodFunc function;
};

/**
 * One row of the optional table of checks, given out through
 *
 *     WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_CHECK_TABLE* GetAPICheckTable();
 *
 * The last row has a null `api` and a null `check`. The two reserved fields belong to the row's width.
 */
struct _tag_API_CHECK_TABLE {
    const char* api;
    int version;
    const char* method;
    APICheckFunc check;
    void* reserved1;
    void* reserved2;
};

/**
 * One row of the table by which a project says what the visitors of its sharing links may call, given out by its check
 * library through
 *
 *     WEBAPI_LIBRARY_EXPORT const ZOVA::_tag_API_SHARING_CHECK_TABLE* GetAPISharingCheckTable();
 *
 * The first row that fits decides, by its function; a call that no row fits is closed to visitors. The last row has a
 * null `apiRegex`.
 */
struct _tag_API_SHARING_CHECK_TABLE {
    /** POSIX extended regular expression for the API's name, or "*". Not anchored: "^" and "$" are the author's. */
    const char* apiRegex;
    /** 0 fits every version. */
    int version;
    /** As `apiRegex`, for the method's name. */
    const char* methodRegex;
    APICheckFunc check;
};

}  // namespace ZOVA
