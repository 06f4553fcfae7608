#pragma once

#include <string>
#include <string_view>

namespace reference {

/**
 * Value of the header Content-Disposition for a file of this name, of which only what stands behind the last slash
 * counts; empty for a name that is none. A name that is more than plain ASCII is given twice: plainly, with "_" for
 * each character that is not, and in UTF-8. Control bytes, backslashes and bytes that are no UTF-8 are "_" in both.
 */
std::string AttachmentNamed(std::string_view path);

}  // namespace reference
