#include "dispatcher/StreamScope.h"

#include <fcntl.h>

#include <iostream>

#include "base/ErrnoGuard.h"

namespace ZOVA {

namespace {

/** The buffer stays closed if the file cannot be opened; the stream is switched to it all the same. */
template <class FileBuffer>
void OpenNull(std::optional<FileBuffer>& buffer, int flags, std::ios_base::openmode mode) {
    const int fd = open("/dev/null", flags | O_CLOEXEC);
    if (fd >= 0) {
        buffer.emplace(fd, mode);
    } else {
        buffer.emplace();
    }
}

}  // namespace

StreamScope::StreamScope(bool keepInput, bool keepOutput) {
    if (!keepInput) {
        OpenNull(inputFile, O_RDONLY, std::ios_base::in);
        savedInput = std::cin.rdbuf(&*inputFile);
    }
    if (!keepOutput) {
        OpenNull(outputFile, O_WRONLY | O_TRUNC, std::ios_base::out | std::ios_base::trunc);
        savedOutput = std::cout.rdbuf(&*outputFile);
    }
}

StreamScope::~StreamScope() {
    base::ErrnoGuard errnoGuard;
    Restore();
}

void StreamScope::CloseFiles() {
    if (inputFile) {
        inputFile->close();
    }
    if (outputFile) {
        outputFile->close();
    }
}

void StreamScope::Restore() {
    if (savedInput != nullptr) {
        std::cin.rdbuf(savedInput);
        savedInput = nullptr;
    }
    if (savedOutput != nullptr) {
        std::cout.rdbuf(savedOutput);
        savedOutput = nullptr;
    }
}

}  // namespace ZOVA
