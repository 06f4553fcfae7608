#pragma once

namespace ZOVA {
class APIRequest;
class APIResponse;
}  // namespace ZOVA

namespace probe {

/** Names of the questions about the client's device that are answered with yes, in their order. */
void TellAgent(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

/** Names of the checks that the text "text" passes, among them "IsPort" for the number "port". */
void TellChecks(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

/** All parameters, and what the web server says of the request. */
void TellRequest(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace probe
