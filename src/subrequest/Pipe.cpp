#include "webapi/Pipe.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "base/ErrnoGuard.h"
#include "base/Log.h"
#include "base/UniqueFd.h"
#include "webapi/Json.h"

namespace ZOVA {

namespace {

struct FreeDeleter {
    void operator()(void* memory) const { free(memory); }
};

void CloseEnd(int& fd) {
    if (fd >= 0) {
        base::ErrnoGuard errnoGuard;
        close(fd);
        fd = -1;
    }
}

/** The pipes that have been opened and not destroyed; made at the first one. */
std::vector<Pipe*>* openPipes = nullptr;

/** The end above the standard descriptors, which are replaced in a child; none if it is refused. */
base::UniqueFd AboveStandard(int end) {
    base::UniqueFd owned(end);
    return end > STDERR_FILENO ? std::move(owned) : base::UniqueFd(fcntl(end, F_DUPFD_CLOEXEC, STDERR_FILENO + 1));
}

}  // namespace

Pipe::Pipe() : readFd(-1), writeFd(-1) {}

Pipe::~Pipe() {
    Close();
    if (openPipes != nullptr) {
        openPipes->erase(std::remove(openPipes->begin(), openPipes->end(), this), openPipes->end());
    }
}

bool Pipe::Init() {
    int ends[2] = {-1, -1};
    if (pipe2(ends, O_CLOEXEC) != 0) {
        return false;
    }
    base::UniqueFd readEnd = AboveStandard(ends[0]);
    base::UniqueFd writeEnd = AboveStandard(ends[1]);
    if (!readEnd.IsOpen() || !writeEnd.IsOpen()) {
        return false;
    }
    readFd = readEnd.Release();
    writeFd = writeEnd.Release();
    if (openPipes == nullptr) {
        openPipes = new std::vector<Pipe*>();
    }
    openPipes->push_back(this);
    return true;
}

void Pipe::ReadOnly(int target) {
    CloseEnd(writeFd);
    if (target >= 0) {
        dup2(readFd, target);
    }
}

void Pipe::WriteOnly(int target) {
    CloseEnd(readFd);
    if (target >= 0) {
        dup2(writeFd, target);
    }
}

void Pipe::Close() {
    ReadOnly(-1);
    WriteOnly(-1);
}

void Pipe::CloseInherited() {
    if (openPipes != nullptr) {
        std::for_each(openPipes->begin(), openPipes->end(), [](Pipe* pipe) { pipe->Close(); });
    }
}

bool Pipe::IsReadable() const {
    return readFd >= 0;
}

bool Pipe::WriteJson(const Json::Value& value) {
    const std::string text = Json::toString(value);
    const std::uint64_t length = text.size();
    return write(writeFd, &length, sizeof(length)) == static_cast<ssize_t>(sizeof(length)) &&
           write(writeFd, text.data(), text.size()) == static_cast<ssize_t>(text.size());
}

bool Pipe::ReadJson(Json::Value& value) {
    std::uint64_t length = 0;
    if (read(readFd, &length, sizeof(length)) != static_cast<ssize_t>(sizeof(length))) {
        WEBAPI_LOG(LOG_ERR, "protocol failed");
        return false;
    }
    if (length == 0) {
        WEBAPI_LOG(LOG_ERR, "error size=0");
        return false;
    }
    // The length is a claim: memory that is not written to costs nothing.
    const std::unique_ptr<char, FreeDeleter> buffer(static_cast<char*>(calloc(length, 1)));
    if (!buffer) {
        WEBAPI_LOG(LOG_ERR, "new szBuf[%lu] failed", static_cast<unsigned long>(length));
        return false;
    }
    const ssize_t got = read(readFd, buffer.get(), length);
    if (got < 0 || static_cast<std::uint64_t>(got) < length) {
        WEBAPI_LOG(LOG_ERR, "read json %lu failed, got %lu", static_cast<unsigned long>(length),
                   static_cast<unsigned long>(got < 0 ? 0 : got));
        return false;
    }
    return Json::fromString(value, std::string(buffer.get(), length));
}

ssize_t Pipe::Read(char* buffer, int length) {
    memset(buffer, 0, static_cast<std::size_t>(length));
    return read(readFd, buffer, static_cast<std::size_t>(length));
}

}  // namespace ZOVA
