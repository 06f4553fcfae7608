#pragma once

#include <cstddef>
#include <string>

namespace package {

constexpr std::size_t kLongestPath = 4095;
constexpr std::size_t kLongestName = 255;

/** The path that stands for all folders of the caller's. */
constexpr char kTopPath[] = "/";

/**
 * Whether the text is a path as clients name things: absolute, each part 1 to 255 bytes and none of them "." or "..",
 * no NUL, no slash at the end, at most 4,095 bytes; or "/" alone. Any other bytes are good: they may be there.
 */
bool IsClientPath(const std::string& text);

/** Whether something new may get the name: one part of a path, valid UTF-8, without control bytes. */
bool IsNewName(const std::string& name);

/** The last part of a path. */
std::string NameOf(const std::string& path);

/** A path to what has the name in the folder. */
std::string Join(const std::string& folder, const std::string& name);

/** Whether the path is the folder's own or leads into it. */
bool IsWithin(const std::string& path, const std::string& folder);

}  // namespace package
