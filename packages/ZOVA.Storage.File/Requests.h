#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

#include <string>
#include <vector>

#include "FileErrors.h"

namespace package {

/** Most paths in one call. */
constexpr unsigned int kMostPaths = 1000;

/**
 * The parameter as a path of the client's form.
 * @return false with 101 in the response for anything but a text, with 401 for a text that is no such path.
 */
bool ReadPath(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, const char* parameter, std::string& out);

/**
 * The parameter "paths": one path, or an array of 1 to 1,000.
 * @return false with 101 for anything else; the paths' form is not looked at.
 */
bool ReadPaths(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, std::vector<std::string>& out);

/** An optional true or false; `out` keeps what it held if there is none. @return false with 101 for anything else. */
bool ReadFlag(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, const char* parameter, bool& out);

/**
 * An optional text that is one of `words`; `out` becomes its index, or keeps what it held if there is none.
 * @param words ends with a null pointer. @return false with 101 for anything else.
 */
bool ReadWord(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, const char* parameter,
              const char* const* words, int& out);

/** What became of each of several things; the answer is a success only if nothing failed. */
class Results {
public:
    /** Adds "path" and, if there is one, "error" to what is known of a thing. */
    void Add(const std::string& path, FileError error, Json::Value known = Json::Value(Json::objectValue));
    /** Answers {"results": ...} as data, or with the first error's number as its details. */
    void Answer(ZOVA::APIResponse* response) const;

    FileError FirstError() const { return firstError; }
    const Json::Value& Rows() const { return rows; }

private:
    Json::Value rows{Json::arrayValue};
    FileError firstError = FILE_OK;
};

}  // namespace package
