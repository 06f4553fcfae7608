#pragma once

#include <sys/stat.h>

#include <string>

#include "FileErrors.h"

namespace package {

/**
 * The rights that something new in a folder gets: those of the folder, but for its owner all and for strangers none to
 * write; for a file without those to execute.
 */
mode_t ModeOfNewFolder(const struct stat& above);
mode_t ModeOfNewFile(const struct stat& above);

/** Makes a folder, with exactly these rights. @param above a folder that is open, as a place at least. */
FileError MakeFolderIn(int above, const std::string& name);

/** Gives an open file of one's own rights and group of the folder that it is for. */
bool AdoptFile(int file, const struct stat& above);

}  // namespace package
