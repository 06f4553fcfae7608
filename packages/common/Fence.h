#pragma once

#include <syslog.h>
#include <webapi/APIResponse.h>

#include <exception>

namespace package {

/**
 * Runs the body of a method. What is thrown in it ends here: it is logged, and the answer is 117.
 * @param name of the method, for the log.
 */
template <class Body>
void Fenced(const char* name, ZOVA::APIResponse* response, Body&& body) noexcept {
    try {
        body();
        return;
    } catch (const std::exception& problem) {
        syslog(LOG_ERR, "%s: %s", name, problem.what());
    } catch (...) {
        syslog(LOG_ERR, "%s: threw what is no std::exception", name);
    }
    try {
        response->SetError(ZOVA::WEBAPI_ERR_INTERNAL, Json::Value());
    } catch (...) {
        syslog(LOG_ERR, "%s: no answer could be made", name);
    }
}

}  // namespace package
