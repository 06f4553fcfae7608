#pragma once

#include <string>

namespace package {

/**
 * The value of "Content-Disposition" by which a browser stores something under the name: in ASCII, and beside it whole.
 * @param name of any bytes; those that are no UTF-8, and control bytes, become "_".
 */
std::string AttachmentNamed(const std::string& name);

}  // namespace package
