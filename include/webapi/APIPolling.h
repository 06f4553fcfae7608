#pragma once

#include <json/value.h>

#include <string>

#include "Export.h"

namespace ZOVA {

class APIPollingPrivate;
class APIRequest;
class APIResponse;

/**
 * Background tasks: a method answers the client at once with a task id, a forked child goes on working, and the client
 * polls for what it reports.
 *
 * A task is named by its full id, owner, "/" and id, the only form that a client sees. Its owner is a login user,
 * "@administrators" or "@users", and decides who may ask for it: nobody sees another user's tasks, administrators
 * included.
 *
 * Each operation tells a failure by false, and why by `GetError` (500 to 508) or, for `Start`, by the response. None
 * writes to the response but `Start`. Nothing is thrown. What fails is logged under the name "APIPolling", client bytes
 * made printable. The object belongs to the method that makes it; it does not own the request.
 */
class WEBAPI_EXPORT APIPolling {
public:
    /** What goes on in the background. The last outcome that it gives its response is the task's. */
    using WorkFunc = void (*)(APIRequest*, APIResponse*, void*);

    APIPolling();
    /** `request` may be null; every operation on tasks then fails with 502. It must outlive the object. */
    explicit APIPolling(APIRequest* request);
    APIPolling(const APIPolling&) = delete;
    APIPolling& operator=(const APIPolling&) = delete;
    ~APIPolling();

    void SetRequest(APIRequest* request);

    // ---- attributes of the next task to start ----

    /** Prefix of the task's id. Default "". */
    bool SetPrefixAttr(const std::string& prefix);
    /** Whether the record goes away some time after the task has finished. Default true. */
    bool SetRemoveAttr(bool remove);
    /** Whether the parameters of the call stay out of the record: for those that are secret. Default false. */
    bool SetRemoveParam(bool remove);
    /**
     * With whom the task is shared: "" (the default) with nobody, "admin" with administrators, "everyone".
     * @return false with 502 for another word, with 505 for "admin" unless an administrator calls.
     */
    bool SetGroupAttr(const std::string& group);

    // ---- tasks ----

    /**
     * Forks a child that calls `work` and then ends; it never comes back from here. Returns in the parent once the
     * child has called `SetSuccess` or `SetError` of the response for the first time, or after 60 seconds; the answer
     * is then `{"data":{"task_id":"<full id>"},"success":true}`. So a work function should report early.
     *
     * The child has a session of its own, the identity of this process, descriptors 0 to 2 at /dev/null, and copies of
     * request, response and data. Its request is a polling task's, which makes each outcome of `response` part of the
     * task's record. SIGTERM ends it. An exception that leaves `work` is logged, and the outcome is 117.
     *
     * @param data is handed to `work`; it may be null.
     * @return false with 502 without request, response or work; with 105, 114 or 110 in the response for a group that
     *     is not allowed, one that is none, and a refused fork; and with neither if the record could not be written.
     */
    bool Start(APIResponse* response, WorkFunc work, void* data);

    /**
     * How one task stands: the members of the body last reported, and "finish", "auto_remove" and "info".
     * @return false with 502 for an empty id, 503 for one that names no task of the caller's, 508 if there is none.
     */
    bool Status(const std::string& fullId, Json::Value& out);
    bool Status(const char* fullId, Json::Value& out);
    /**
     * How several tasks stand: an object with a member for each id. An id that is not the caller's is left out, a task
     * that is gone is an empty object.
     * @return false with 502 unless `fullIds` is an array.
     */
    bool Status(const Json::Value& fullIds, Json::Value& out);

    /**
     * Sends SIGTERM to the task's process, if it still runs, and marks the task finished. Does not wait for its end.
     * @param remove whether the record is to go away as well.
     * @return false with 502, 503 or 508 for the id, 506 if the process cannot be signalled, 501 if the record cannot
     *     be written.
     */
    bool Stop(const std::string& fullId, bool remove);

    /**
     * The full ids of tasks whose id begins with the prefix, as a member of `out` for each group: "user", "everyone",
     * "admin". A group without tasks is null. Other members of `out` stay, also after a failure.
     * @return false with 502 unless `groups` is an array, 503 for another word, 505 for "admin" unless an
     *     administrator calls.
     */
    bool List(const std::string& prefix, const Json::Value& groups, Json::Value& out);

    void SetError(int error);
    /** The number of the last failure; 500 before any. Never cleared. */
    int GetError() const;

private:
    APIPollingPrivate* d;
};

}  // namespace ZOVA
