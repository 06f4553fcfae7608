#pragma once

#include <webapi/APIResponse.h>

#include <syslog.h>

#include <exception>

namespace package {

/**
 * Runs the body of a method. What is thrown in it ends here: it is logged, and the answer is 117.
 * @param name of the method, for the log.
 */
template <class Body>
void Fenced(const char* name, ZOVA::APIResponse* response, Body&& body) noexcept {
    try {
        try {
            body();
        } catch (const std::exception& problem) {
            syslog(LOG_ERR, "%s: %s", name, problem.what());
            response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
        }
    } catch (...) {
        // Not even the error could be set, for want of memory: the answer that stands is the framework's own 117.
        syslog(LOG_ERR, "%s: no answer could be made", name);
    }
}

}  // namespace package
