#pragma once

#include <json/value.h>

#include <cstdint>

#include "zovasharing/Link.h"

namespace reference::sharing {

/**
 * Takes the fields that an owner gives for a new or an existing link; `link` names its owner already, and is not to be
 * used after a failure. A password is made into its kept text.
 * @param changes whether the link exists: then only what is given is replaced.
 * @return a ZovaLinkResult.
 */
int TakeLinkFields(const Json::Value& fields, bool changes, int64_t now, Link& link);

/** Whether these fields change who may see what, so that sessions made before must end. */
bool ChangeAccess(const Json::Value& fields);

/** The link as its owner sees it. */
Json::Value LinkJson(const Link& link);

}  // namespace reference::sharing
