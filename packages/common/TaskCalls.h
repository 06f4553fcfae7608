#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

#include <string>

namespace package {

/** Most tasks that one call may ask for. */
constexpr unsigned int kMostTaskIds = 1000;

/**
 * Answers how the tasks of "task_id" stand: one full id, or an array of up to 1,000 of them.
 * @param prefix of the ids that this API knows: a task of another prefix is one that does not exist.
 * Errors: 101 for another parameter; 502, 503, 508 as the framework finds them.
 */
void AnswerTaskStatus(ZOVA::APIRequest* request, ZOVA::APIResponse* response, const std::string& prefix);

/**
 * Stops the task of "task_id"; "remove" (default true) says whether its record is to go away.
 * Errors: as for the status, and 501 and 506.
 */
void AnswerTaskStop(ZOVA::APIRequest* request, ZOVA::APIResponse* response, const std::string& prefix);

}  // namespace package
