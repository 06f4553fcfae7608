// Runs a fuzz target once for each file of the given folders, for builds without a fuzzer.

#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "Target.h"

namespace {

std::vector<std::filesystem::path> FilesOf(const char* folder) {
    std::vector<std::filesystem::path> files;
    for (const auto& entry : std::filesystem::directory_iterator(folder)) {
        files.push_back(entry.path());
    }
    std::sort(files.begin(), files.end());
    return files;
}

void Run(const std::filesystem::path& path) {
    // Named before it runs, so that the file of a crash is known.
    fprintf(stderr, "%s\n", path.c_str());
    std::ifstream file(path, std::ios::binary);
    const std::vector<char> input{std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
    // A copy of exactly that size, so that reading past its end is noticed.
    LLVMFuzzerTestOneInput(reinterpret_cast<const uint8_t*>(input.data()), input.size());
}

}  // namespace

int main(int argc, char** argv) {
    size_t count = 0;
    for (int i = 1; i < argc; ++i) {
        for (const std::filesystem::path& path : FilesOf(argv[i])) {
            Run(path);
            ++count;
        }
    }
    printf("%zu inputs\n", count);
    return count > 0 ? 0 : 1;
}
