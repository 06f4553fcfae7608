#include "zovacgi/UploadBody.h"

#include <strings.h>
#include <syslog.h>

#include <algorithm>
#include <charconv>
#include <cstdlib>
#include <cstring>

#include "webapi/UrlText.h"

namespace reference {

namespace {

constexpr size_t kBufferSize = 262144;
constexpr size_t kLongestSliceName = 490;

const char* Variable(const char* name) {
    const char* value = getenv(name);
    return value != nullptr ? value : "";
}

/** 0 for what is no decimal number or does not fit. */
uint64_t AnnouncedLength() {
    const char* text = Variable("CONTENT_LENGTH");
    const char* end = text + strlen(text);
    uint64_t length = 0;
    const auto [stop, error] = std::from_chars(text, end, length);
    return error == std::errc() && stop == end ? length : 0;
}

std::string NameOfSlice(const char* header) {
    std::string name = header != nullptr ? PercentDecode(header, false) : "";
    if (name.empty() || name.size() > kLongestSliceName || name.find('\0') != std::string::npos) {
        name = "unnamed";
    }
    return name;
}

}  // namespace

UploadBody& UploadBody::OfProcess() {
    const bool isSlice = strcasecmp(Variable("HTTP_X_TYPE_NAME"), "SLICEUPLOAD") == 0;
    static UploadBody body(stdin, AnnouncedLength(), Variable("CONTENT_TYPE"),
                           isSlice ? Variable("HTTP_X_FILE_NAME") : nullptr);
    return body;
}

UploadBody::UploadBody(FILE* from, uint64_t announced, std::string_view contentType, const char* sliceName)
    : stream(from),
      length(announced),
      boundary(MultipartDecoder::BoundaryOf(contentType)),
      decoder(boundary),
      slice(boundary.empty() && sliceName != nullptr),
      sliceFile(NameOfSlice(sliceName)) {
    if (slice) {
        // No multipart delimiter, but what tells the functions of one upload that they belong together.
        boundary = "slice";
    }
}

UploadBody::Event UploadBody::Next() {
    if (status < 0) {
        return Event::kError;
    }
    if (boundary.empty()) {
        return Fail(ZOVA_UPLOAD_NO_UPLOAD, "the content type is no multipart/form-data with a usable boundary");
    }
    if (length == 0) {
        return Fail(ZOVA_UPLOAD_EMPTY, "it has no body, or one of unknown length");
    }
    Event event = slice ? NextOfSlice() : decoder.Next(input);
    while (event == Event::kMore) {
        if (!Fill()) {
            return Fail(ZOVA_UPLOAD_CUT_OFF, "the body ends too early");
        }
        event = slice ? NextOfSlice() : decoder.Next(input);
    }
    if (event == Event::kError) {
        return Fail(decoder.IsTooLarge() ? ZOVA_UPLOAD_TOO_LARGE : ZOVA_UPLOAD_MALFORMED, decoder.Problem());
    }
    offered = offered && event != Event::kFile;
    inFile = event == Event::kFile || event == Event::kData;
    status = event == Event::kEnd ? ZOVA_UPLOAD_COMPLETE : ZOVA_UPLOAD_RUNNING;
    return event;
}

std::string UploadBody::DelimiterBeforeRest() const {
    return bytesRead == 0 ? "" : "--" + boundary + (decoder.IsAtEnd() ? "--" : "\r\n");
}

UploadBody::Event UploadBody::NextOfSlice() {
    switch (sliceState) {
        case SliceState::kBegin:
            sliceState = SliceState::kData;
            return Event::kFile;
        case SliceState::kData:
            if (!input.empty()) {
                sliceData = input;
                input = std::string_view();
                return Event::kData;
            }
            if (bytesRead < length) {
                return Event::kMore;
            }
            sliceState = SliceState::kEnd;
            return Event::kFileEnd;
        case SliceState::kEnd:
            break;
    }
    return Event::kEnd;
}

bool UploadBody::Fill() {
    if (!buffer) {
        buffer.reset(new char[kBufferSize]);
    }
    const uint64_t left = length - bytesRead;
    const size_t wanted = static_cast<size_t>(std::min<uint64_t>(left, exact ? 1 : kBufferSize));
    const size_t got = wanted > 0 ? fread(buffer.get(), 1, wanted, stream) : 0;
    input = std::string_view(buffer.get(), got);
    bytesRead += got;
    if (got > 0 && callback != nullptr) {
        callback(bytesRead, length);
    }
    return got > 0;
}

UploadBody::Event UploadBody::Fail(ZovaCgiUploadStatus why, const char* text) {
    status = why;
    syslog(LOG_ERR, "upload refused behind %llu of %llu bytes: %s", static_cast<unsigned long long>(bytesRead),
           static_cast<unsigned long long>(length), text);
    return Event::kError;
}

}  // namespace reference
