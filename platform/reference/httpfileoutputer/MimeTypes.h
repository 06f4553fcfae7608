#pragma once

#include <string>
#include <string_view>

namespace reference {

constexpr const char* kUnknownMimeType = "application/octet-stream";

/** What the text of a table of MIME types says of an extension: lines of "type extension...", "#" starts a comment.
 * Letters of either case are the same. Empty if it says nothing. */
std::string_view FindMimeType(std::string_view table, std::string_view extension);

/** The type of a file of this name by the system's table, `kUnknownMimeType` if it tells none. */
std::string MimeTypeOf(std::string_view fileName);

}  // namespace reference
