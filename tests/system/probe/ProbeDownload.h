#pragma once

namespace ZOVA {
class APIRequest;
class APIResponse;
}  // namespace ZOVA

namespace probe {

/** Sends the file at "path", as the type "type" if there is one, without the fast path if "fast" is false. */
void SendPath(ZOVA::APIRequest* request, ZOVA::APIResponse* response);
/** The same, opened by the method itself; what cannot be opened is error 1005. */
void SendStream(ZOVA::APIRequest* request, ZOVA::APIResponse* response);
/** Sends the numbers from 1 to "last", a line each, as a program writes them. */
void SendPipe(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace probe
