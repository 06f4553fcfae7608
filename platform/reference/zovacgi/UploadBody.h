#pragma once

#include <cstdint>
#include <cstdio>
#include <memory>
#include <string>
#include <string_view>

#include "zovacgi.h"
#include "zovacgi/MultipartDecoder.h"

namespace reference {

/**
 * The body of an upload as a sequence of events, read from a stream: multipart/form-data, or a slice, which is one file
 * and nothing else. Reads at most the announced length, and holds one buffer whatever that is.
 */
class UploadBody {
public:
    using Event = MultipartDecoder::Event;

    /** The body of the request in the process environment, on standard input; the same from call to call. */
    static UploadBody& OfProcess();

    /**
     * @param input not owned.
     * @param length what the client announced.
     * @param sliceName the client's name of the file if the body is a slice, else null.
     */
    UploadBody(FILE* input, uint64_t length, std::string_view contentType, const char* sliceName);

    /** Whether `Next` reads no byte beyond the one that made its event; slow. Else it reads as much as it can hold. */
    void SetExact(bool isExact) { exact = isExact; }
    void SetCallback(ZovaCgiUploadCallback function) { callback = function; }

    /** Never kMore. After kError, `Status` says what it was, and it is logged. */
    Event Next();
    /** Whether the last event was the beginning of a file or a piece of it. */
    bool IsInFile() const { return inFile; }
    /** Notes that the file was offered to the method: the next search for one goes on behind it. */
    void Offer() { offered = true; }
    bool WasOffered() const { return offered; }
    /** Whether the body is a slice: it has no form fields in front. */
    bool IsSlice() const { return slice; }

    const std::string& Name() const { return slice ? sliceField : decoder.Name(); }
    const std::string& Value() const { return slice ? sliceFile : decoder.Value(); }
    std::string_view Data() const { return slice ? sliceData : decoder.Data(); }
    const std::string& Boundary() const { return boundary; }
    /** The delimiter that was read behind a field and has to stand before the rest to make it a body again. */
    std::string DelimiterBeforeRest() const;
    uint64_t BytesRead() const { return bytesRead; }
    uint64_t Length() const { return length; }
    ZovaCgiUploadStatus Status() const { return status; }

private:
    enum class SliceState { kBegin, kData, kEnd };

    Event NextOfSlice();
    bool Fill();
    Event Fail(ZovaCgiUploadStatus why, const char* text);

    FILE* stream;
    uint64_t length;
    std::string boundary;
    MultipartDecoder decoder;
    bool slice;
    SliceState sliceState = SliceState::kBegin;
    std::string sliceField = "file";
    std::string sliceFile;
    std::string_view sliceData;
    bool exact = false;
    bool inFile = false;
    bool offered = false;
    ZovaCgiUploadCallback callback = nullptr;
    uint64_t bytesRead = 0;
    std::unique_ptr<char[]> buffer;
    std::string_view input;
    ZovaCgiUploadStatus status = ZOVA_UPLOAD_RUNNING;
};

}  // namespace reference
