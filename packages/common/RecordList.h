#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

#include <cstddef>
#include <optional>
#include <string>

namespace package {

/** Error numbers of the methods that keep a list of records. */
enum RecordListError : int {
    /** A record cannot be used; "errors" says which, its member, and why. */
    RECORD_LIST_ERR_RECORD = 401,
    /** The stored list is damaged, or open to others than root. */
    RECORD_LIST_ERR_FILE = 402,
    /** The list could not be read or written. */
    RECORD_LIST_ERR_SYSTEM = 403,
};

/** Why a record cannot be used. */
struct RecordProblem {
    /** Path of the member, such as "apis[0].params[1]"; empty for the record as a whole. */
    std::string member;
    /** One of the words in packages/README.md. */
    const char* reason;
};

/** Looks at one record of a list; it may look at the others too. */
using RecordCheck = std::optional<RecordProblem> (*)(const Json::Value& records, Json::ArrayIndex at);

/** Longest list that is taken, as JSON text in bytes. */
constexpr std::size_t kLongestRecordList = 256 << 10;
/** Deepest nesting of one record. */
constexpr int kDeepestRecord = 32;

/** A list of records in a private file of the device's folder, as a JSON array. */
struct RecordList {
    const char* file;
    /** Name of the parameter that brings a new list. */
    const char* parameter;
    /** Most records that are taken. */
    Json::ArrayIndex most;
    RecordCheck check;
};

/**
 * Reads the list; a missing file is an empty list.
 * @return false if there is one that cannot be used: the error is then in the response, and logged.
 */
bool ReadRecords(const RecordList& list, ZOVA::APIResponse* response, Json::Value& out);

/**
 * Replaces the list by the one of the request, as a whole or not at all, and answers.
 * Errors: 101 for a parameter that is no array, has too many records or is too long; 401, 402, 403 as above. A
 * replacement is logged, without the records.
 */
void ReplaceRecords(const RecordList& list, ZOVA::APIRequest* request, ZOVA::APIResponse* response);

/**
 * What holds for any record: it is an object of known members, not nested too deep, and its texts are valid UTF-8.
 * @param known names of the members, with a null pointer at the end.
 */
std::optional<RecordProblem> CheckForm(const Json::Value& record, const char* const* known);

}  // namespace package
