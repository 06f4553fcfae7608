#pragma once

namespace ZOVA {
class APIRequest;
class APIResponse;
}  // namespace ZOVA

namespace probe {

/**
 * Tells of an upload: its parameters, each file as its method finds it, and the process's greatest memory. Moves the
 * file "file" to the path "keep" if there is one.
 */
void TellUpload(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

/** Takes an upload step by step and tells of it; stops after the first file if "stops" is true. */
void TakeUpload(ZOVA::APIRequest* request, ZOVA::APIResponse* response);

}  // namespace probe
