#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace package {

/** Sizes in bytes. */
struct VolumeSize {
    std::uint64_t total;
    std::uint64_t free;
    /** What an unprivileged user can still fill. */
    std::uint64_t available;
};

/** Asks for the size of one file system; false if it cannot be told. */
using SizeFunction = bool (*)(const char* mountPoint, VolumeSize& out);

/** The size as `statvfs` has it. False also for a file system without blocks. */
bool ReadVolumeSize(const char* mountPoint, VolumeSize& out);

/**
 * The sizes of file systems, in the order of `mountPoints`; none for one that cannot be read or does not answer.
 *
 * A file system whose device is gone may block its caller for ever, so that children ask, which hold nothing of the
 * client's connection. Two children at most are given up on, then the rest is left without a size.
 * @param patience how long one file system may take.
 */
std::vector<std::optional<VolumeSize>> ProbeVolumes(const std::vector<std::string>& mountPoints,
                                                    std::chrono::milliseconds patience,
                                                    SizeFunction read = ReadVolumeSize);

}  // namespace package
