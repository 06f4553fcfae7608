#pragma once

#include <string>
#include <vector>

namespace package {

/** One mounted file system. Texts are as the kernel has them, without its escapes. */
struct Mount {
    std::string mountPoint;
    std::string device;
    std::string type;
};

/**
 * The real file systems of a mount table in the form of /proc/self/mountinfo: those that keep files on a device of this
 * machine. One row per device, at the mount point of its root where it has one; a mount point that another mount covers
 * is left out. Lines that cannot be read are passed over.
 */
std::vector<Mount> RealMounts(const std::string& mountTable);

}  // namespace package
