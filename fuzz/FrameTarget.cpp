// The framed pipe. The first two bytes of an input say where the rest is cut in two: the writer writes what stands
// before the cut, then what stands behind it, and ends.

#include <fcntl.h>
#include <limits.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <string>

#include "Check.h"
#include "JsonRoundTrip.h"
#include "Target.h"
#include "common/UniqueFd.h"
#include "webapi/Json.h"
#include "webapi/Pipe.h"

namespace {

constexpr size_t kCutSize = 2;
constexpr size_t kHeaderSize = sizeof(std::uint64_t);
/** Every pipe takes that much at once, also one that the kernel makes small. */
constexpr size_t kMostBytes = PIPE_BUF;
/** What the machine of these tests has for one frame. */
constexpr size_t kMemory = 1 << 16;
constexpr const char* kUntouched = "as before";

/** The numbers of the two ends of the next pipe: the same again unless a descriptor was opened or lost. */
struct Ends {
    int read = -1;
    int write = -1;
};

Ends NextEnds() {
    int ends[2];
    FUZZ_CHECK(pipe2(ends, O_CLOEXEC) == 0);
    FUZZ_CHECK(close(ends[0]) == 0 && close(ends[1]) == 0);
    return {ends[0], ends[1]};
}

/** The writer of a pipe, in this process: one piece comes with each read of the other side. */
class Writer {
public:
    Writer(const Ends& ends, const std::string& bytes, size_t cut)
        : pieces{bytes.substr(0, cut), bytes.substr(cut)}, end(fcntl(ends.write, F_DUPFD_CLOEXEC, 0)) {
        FUZZ_CHECK(end.IsOpen());
        reader = ends.read;
        current = this;
    }
    Writer(const Writer&) = delete;
    Writer& operator=(const Writer&) = delete;
    ~Writer() { current = nullptr; }

    /** Called for each read: so that it never blocks, there is a byte in the pipe then, or the writer has ended. */
    static void BeforeReadOf(int fd) {
        if (current != nullptr && fd == current->reader) {
            current->Put();
        }
    }

private:
    void Put() {
        while (next < 2 && pieces[next].empty()) {
            ++next;
        }
        if (next == 2) {
            end.Reset(-1);
            return;
        }
        const std::string& piece = pieces[next++];
        FUZZ_CHECK(write(end.Get(), piece.data(), piece.size()) == static_cast<ssize_t>(piece.size()));
    }

    static Writer* current;
    std::string pieces[2];
    size_t next = 0;
    int reader = -1;
    reference::UniqueFd end;
};

Writer* Writer::current = nullptr;

/** What comes out of the pipe, by a second and plainer reading. */
class Expected {
public:
    Expected(const std::string& bytes, size_t cut) : pieces{bytes.substr(0, cut), bytes.substr(cut)} {}

    bool HasMore() const { return !(arrived.empty() && pieces[0].empty() && pieces[1].empty()); }

    /** False if no frame comes; `value` is then left alone. Takes a byte at least, if there is one. */
    bool Frame(Json::Value& value) {
        const std::string header = Read(kHeaderSize);
        std::uint64_t length = 0;
        if (header.size() < kHeaderSize) {
            return false;
        }
        memcpy(&length, header.data(), kHeaderSize);
        if (length == 0 || length > kMemory) {
            return false;
        }
        const std::string text = Read(length);
        return text.size() == length && Json::fromString(value, text);
    }

private:
    std::string Read(size_t most) {
        const size_t piece = pieces[0].empty() ? 1 : 0;
        arrived += pieces[piece];
        pieces[piece].clear();
        const std::string got = arrived.substr(0, most);
        arrived.erase(0, got.size());
        return got;
    }

    std::string pieces[2];
    std::string arrived;
};

void CheckReceived(const std::string& bytes, size_t cut) {
    const Ends ends = NextEnds();
    {
        ZOVA::Pipe pipe;
        FUZZ_CHECK(pipe.Init());
        const Writer writer(ends, bytes, cut);
        pipe.ReadOnly(-1);
        Expected expected(bytes, cut);
        while (expected.HasMore()) {
            Json::Value got(kUntouched);
            Json::Value wanted(kUntouched);
            FUZZ_CHECK(pipe.ReadJson(got) == expected.Frame(wanted));
            FUZZ_CHECK(Json::toString(got) == Json::toString(wanted));
        }
        Json::Value got(kUntouched);
        FUZZ_CHECK(!pipe.ReadJson(got) && got == kUntouched);
    }
    const Ends after = NextEnds();
    FUZZ_CHECK(after.read == ends.read && after.write == ends.write);
}

/** Sends the value, and one more behind it, which the first must not reach into. */
void CheckSent(const Json::Value& value) {
    constexpr size_t kLastFrame = kHeaderSize + sizeof("true") - 1;
    if (kHeaderSize + Json::toString(value).size() + kLastFrame > kMostBytes) {
        return;
    }
    ZOVA::Pipe pipe;
    FUZZ_CHECK(pipe.Init() && pipe.WriteJson(value) && pipe.WriteJson(true));
    Json::Value got(kUntouched);
    if (pipe.ReadJson(got)) {
        FUZZ_CHECK(got == value);
    } else {
        FUZZ_CHECK(fuzz::Depth(value) > Json::kMaximumDepth && got == kUntouched);
    }
    FUZZ_CHECK(pipe.ReadJson(got) && got == true);
}

std::string Framed(const std::string& text) {
    const std::uint64_t length = text.size();
    return std::string(reinterpret_cast<const char*>(&length), kHeaderSize) + text;
}

}  // namespace

extern "C" {

ssize_t __real_read(int fd, void* buffer, size_t size);
void* __real_calloc(size_t count, size_t size);

/** In front of the C library's in what is linked here. */
ssize_t __wrap_read(int fd, void* buffer, size_t size) {
    Writer::BeforeReadOf(fd);
    return __real_read(fd, buffer, size);
}

/** A claimed length costs no more than the machine has. */
void* __wrap_calloc(size_t count, size_t size) {
    return count > kMemory / std::max<size_t>(size, 1) ? nullptr : __real_calloc(count, size);
}

}  // extern "C"

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size < kCutSize) {
        return 0;
    }
    const size_t place = data[0] + 256u * data[1];
    const std::string bytes = fuzz::TextOf(data + kCutSize, std::min(size - kCutSize, kMostBytes - kHeaderSize));
    const std::string framed = Framed(bytes);
    CheckReceived(bytes, place % (bytes.size() + 1));
    CheckReceived(framed, place % (framed.size() + 1));
    Json::Value value;
    if (Json::fromString(value, bytes)) {
        CheckSent(value);
    }
    return 0;
}
