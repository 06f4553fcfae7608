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

/** Setting the buffer clears the state; a stream that reports its state by exceptions stays with the cleared one. */
void GiveBack(std::ios& stream, std::streambuf*& saved, std::ios_base::iostate state) {
    if (saved == nullptr) {
        return;
    }
    stream.rdbuf(saved);
    saved = nullptr;
    if ((stream.exceptions() & state) == 0) {
        stream.setstate(state);
    }
}

}  // namespace

StreamScope::StreamScope(bool keepInput, bool keepOutput) {
    if (!keepInput) {
        OpenNull(inputFile, O_RDONLY, std::ios_base::in);
        inputState = std::cin.rdstate();
        savedInput = std::cin.rdbuf(&*inputFile);
    }
    if (!keepOutput) {
        OpenNull(outputFile, O_WRONLY | O_TRUNC, std::ios_base::out | std::ios_base::trunc);
        outputState = std::cout.rdstate();
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
    GiveBack(std::cin, savedInput, inputState);
    GiveBack(std::cout, savedOutput, outputState);
}

}  // namespace ZOVA
