#pragma once

/** Marks what leaves libwebapi-ZELM5.so; everything else in it is hidden. */
#define WEBAPI_EXPORT __attribute__((visibility("default")))

/** Keeps a private function of an exported class inside the library. */
#define WEBAPI_LOCAL __attribute__((visibility("hidden")))

/**
 * Marks the functions that an API library offers to the dispatcher
 * (`GetAPITable`, `GetAPICheckTable`): a plain, unmangled, visible symbol.
 */
#define WEBAPI_LIBRARY_EXPORT extern "C" __attribute__((visibility("default")))
