#pragma once

#include <string>

/** A device folder of the test's own, below a temporary folder that goes with it. One at a time. */
class OwnDeviceFolder {
public:
    /** The folder itself is not made. */
    OwnDeviceFolder();
    ~OwnDeviceFolder();
    OwnDeviceFolder(const OwnDeviceFolder&) = delete;
    OwnDeviceFolder& operator=(const OwnDeviceFolder&) = delete;

    /** Makes the folder with the mode. */
    void Make(unsigned int mode = 0700) const;
    std::string Path(const std::string& name = "") const;
    /** Makes the folder if needed, and in it a file with exactly this mode. */
    void Put(const std::string& name, const std::string& content, unsigned int mode = 0600) const;
    std::string Content(const std::string& name) const;
    /** Names in the folder, in order. */
    std::string Names() const;

private:
    std::string above;
};
