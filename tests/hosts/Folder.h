#pragma once

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <string>

/** A private folder for as long as it lives. */
class Folder {
public:
    Folder() {
        char name[] = "/tmp/host-tests-XXXXXX";
        EXPECT_NE(mkdtemp(name), nullptr);
        path = name;
    }
    Folder(const Folder&) = delete;
    Folder& operator=(const Folder&) = delete;
    ~Folder() { std::filesystem::remove_all(path); }

    std::string In(const std::string& name) const { return path + "/" + name; }

private:
    std::string path;
};
