#pragma once

#include <functional>
#include <string>

namespace package {

enum class ContentResult { kFound, kNone, kUnreadable };

/**
 * Looks for the bytes in a regular file of a folder; a link is not followed. Reads in pieces, whatever the size.
 * @param folder descriptor of the folder.
 * @param pause called after each piece.
 */
ContentResult FindContent(int folder, const char* name, const std::string& content, const std::function<void()>& pause);

}  // namespace package
