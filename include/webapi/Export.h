#pragma once

/** Marks what leaves libwebapi-ZELM5.so; everything else in it is hidden. */
#define WEBAPI_EXPORT __attribute__((visibility("default")))

/**
 * Marks the functions that an API library offers to the dispatcher
 * (`GetAPITable`, `GetAPICheckTable`): a plain, unmangled, visible symbol.
 */
#define WEBAPI_LIBRARY_EXPORT extern "C" __attribute__((visibility("default")))
