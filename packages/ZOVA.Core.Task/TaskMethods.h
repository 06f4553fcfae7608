#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace package {

/**
 * "status": how one task stands, or several; "task_id" is a full id or an array of up to 1,000.
 *
 * Answers, for one, what the task reported last ("success", "data", "error") and "finish", "auto_remove", "info"; for
 * several an object with such a status for each id of the caller's, empty for a task that is gone.
 * Errors: 101 for another "task_id"; 502, 503, 508.
 */
void TaskStatus(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

/**
 * "stop": ends the task "task_id". "remove" (default true) says whether its record goes away.
 * Errors: 101, 501, 502, 503, 506, 508.
 */
void StopTask(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

/**
 * "list": full ids by group. "groups" is an array of up to three of "user", "everyone" and "admin", by default
 * ["user"]; "prefix" is what the ids begin with, by default anything.
 * Errors: 101 for another parameter; 503 for another group, 505 for "admin" unless an administrator calls.
 */
void ListTasks(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace package
