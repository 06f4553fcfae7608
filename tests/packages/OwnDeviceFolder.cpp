#include "OwnDeviceFolder.h"

#include <gtest/gtest.h>
#include <stdlib.h>
#include <sys/stat.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <set>
#include <stdexcept>

#include "../../packages/common/DeviceFolder.h"

namespace {

std::string folder;

}  // namespace

namespace package {

const char* DeviceFolder() {
    return folder.c_str();
}

}  // namespace package

OwnDeviceFolder::OwnDeviceFolder() {
    std::string pattern = testing::TempDir() + "device-XXXXXX";
    if (mkdtemp(pattern.data()) == nullptr) {
        throw std::runtime_error("no temporary folder");
    }
    above = pattern;
    folder = above + "/zova";
}

OwnDeviceFolder::~OwnDeviceFolder() {
    folder.clear();
    std::error_code ignored;
    std::filesystem::remove_all(above, ignored);
}

void OwnDeviceFolder::Make(unsigned int mode) const {
    std::filesystem::create_directories(folder);
    chmod(folder.c_str(), mode);
}

std::string OwnDeviceFolder::Path(const std::string& name) const {
    return name.empty() ? folder : folder + "/" + name;
}

void OwnDeviceFolder::Put(const std::string& name, const std::string& content, unsigned int mode) const {
    Make();
    std::ofstream(Path(name), std::ios::binary) << content;
    chmod(Path(name).c_str(), mode);
}

std::string OwnDeviceFolder::Content(const std::string& name) const {
    std::ifstream file(Path(name), std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

std::string OwnDeviceFolder::Names() const {
    std::set<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(folder)) {
        names.insert(entry.path().filename());
    }
    std::string all;
    for (const std::string& name : names) {
        all += (all.empty() ? "" : " ") + name;
    }
    return all;
}
