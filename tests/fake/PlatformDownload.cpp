// libhttp-file-outputer.so.6 on the fake platform: what it is asked to send, it writes as a mark to standard output.

#include <cerrno>

#include "FakePlatform.h"
#include "httpfileoutputer.h"

using fake::FakePlatform;

namespace {

bool Send(const char* name, const std::string& arguments) {
    FakePlatform& platform = FakePlatform::Required(name);
    const bool isSent = platform.Enter(name, arguments, EPIPE);
    printf("<%s>", isSent ? arguments.c_str() : "failed");
    return isSent;
}

}  // namespace

std::string HTTPFileOutputer::GetMimeType(const std::string& fileName) {
    FakePlatform& platform = FakePlatform::Required("HTTPFileOutputer::GetMimeType");
    platform.Enter("HTTPFileOutputer::GetMimeType", fileName, 0);
    return "type of/" + fileName;
}

bool HTTPFileOutputer::Output(const std::string& path, const std::string& mimeType) {
    return Send("HTTPFileOutputer::Output", path + ", " + mimeType);
}

bool HTTPFileOutputer::Output(FILE* stream, const std::string& fileName, const std::string& mimeType) {
    return Send("HTTPFileOutputer::OutputStream",
                std::string(stream == nullptr ? "no stream" : "stream") + ", \"" + fileName + "\", " + mimeType);
}

namespace ZOVA::HTTP {

bool FileOutputerHelper::SetFastOutputEnabled(bool enable) {
    FakePlatform& platform = FakePlatform::Required("SetFastOutputEnabled");
    if (!platform.Enter("SetFastOutputEnabled", enable ? "true" : "false", EACCES)) {
        return false;
    }
    platform.fastOutput = enable;
    return true;
}

bool FileOutputerHelper::IsFastOutputEnabled() {
    FakePlatform& platform = FakePlatform::Required("IsFastOutputEnabled");
    platform.Enter("IsFastOutputEnabled", "", 0);
    return platform.fastOutput;
}

}  // namespace ZOVA::HTTP
