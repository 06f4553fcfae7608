// Prints what is mapped: "start" with the shared objects at the beginning, "cipher" with those after a cipher was used.

#include <json/value.h>

#include <cstring>
#include <fstream>
#include <iostream>
#include <set>
#include <string>

#include "webapiutil.h"
#include "zovacgi.h"
#include "zovacredential.h"

namespace {

void PrintMapped(const char* title) {
    std::ifstream maps("/proc/self/maps");
    std::set<std::string> files;
    for (std::string line; std::getline(maps, line);) {
        const size_t slash = line.find('/');
        if (slash != std::string::npos) {
            files.insert(line.substr(line.rfind('/') + 1));
        }
    }
    std::cout << title;
    for (const std::string& file : files) {
        std::cout << " " << file;
    }
    std::cout << "\n";
}

}  // namespace

int main() {
    if (ZOVA::WebAPIUtil::URLEncode(" ") != "%20" || ZovaCgiUIDGet("") != 4294967295u) {
        return 1;
    }
    PrintMapped("start");
    std::string plain;
    const std::string sealed(64, 'A');
    if (ZOVA::CredRequestUtil::GetDecryptAESString(std::string(32, 'k'), sealed, plain)) {
        return 1;
    }
    PrintMapped("cipher");
    return 0;
}
