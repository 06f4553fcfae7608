#pragma once

#include <json/value.h>

#include <string>

#include "Export.h"

/**
 * Queries from one part of the system to an API of the system or to an outside server, without a client in between, and
 * two small functions beside them. Every failure is a false result with a line in the log unless said otherwise; no
 * function throws. A query blocks for as long as the other side takes, within the limits stated.
 */
namespace ZOVA::APIUtils {

/**
 * Asks an API of this system through the fast API service.
 *
 * It runs as the administrator unless `description` names another: hand on nothing that a client chose. The whole
 * description stands in the log if the service cannot be reached, cut to 512 bytes: put no secret into it.
 * @param description an object with "params", which holds "api", "method", "version" and the method's parameters, and
 *     optionally "runner". A "runner" without "username" gets "admin". One that is no object is refused.
 * @param answer receives the JSON text of the response body; left alone on failure.
 */
WEBAPI_EXPORT bool QueryFastWebapi(const Json::Value& description, std::string& answer);

/** The same with the answer parsed; also false, without a line, for an answer that is no JSON. */
WEBAPI_EXPORT bool QueryFastWebapi(const Json::Value& description, Json::Value& answer);

/**
 * Sends a POST over HTTPS, or runs a local API as the administrator.
 *
 * The certificate of the other side is NOT verified, whoever it is: anybody on the way can read and change what passes.
 * No redirect is followed, no proxy used. Limits: 60 seconds, and an answer of 16 MiB of body and 1 MiB of headers.
 * @param endpoint an URL "https://..."; or a path on this device's own web server ("webapi/front.cgi"); or "" for a
 *     call in this process, which the body names as "api=NAME&method=NAME&version=NUMBER", with parameters behind.
 *     "http://" and any other scheme are refused.
 * @param headers request headers, one a line; receives the response's header lines as they came, status line first. A
 *     call in this process leaves them alone.
 * @param body receives the response's body, up to its first NUL byte, or the JSON text of the local call's result.
 * @return whether an answer came, whatever it says: neither an HTTP status nor an API's error is looked at. On failure
 *     headers and body are left alone; a failed transfer is not logged.
 */
WEBAPI_EXPORT bool QueryWebapi(const std::string& endpoint, std::string& headers, std::string& body);

/**
 * Picks values out of a JSON answer. Where the template has a text "{name}", the source's value at the same place goes
 * into the member "name" of `output`, whatever its type; objects are followed to any depth, all else is ignored.
 * @param output null or an object, whose other members stay; anything else is replaced at the first value stored.
 * @return always true: what does not match is not there.
 */
WEBAPI_EXPORT bool ResolveJson(const Json::Value& source, const Json::Value& templateValue, Json::Value& output);

/**
 * Sets one key of the device's information file, as root for as long as that takes: the effective ids are as before
 * afterwards. Needs a process that may become root. Logs a change of ids that was refused; a write that failed is not
 * logged. Not to be used beside other threads.
 */
WEBAPI_EXPORT bool SetZovaInfo(const std::string& key, const std::string& value);

}  // namespace ZOVA::APIUtils
