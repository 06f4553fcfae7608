#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace reference {

/**
 * A streaming decoder of multipart/form-data. It does no input or output: bytes are pushed in pieces of any size, and
 * what they mean comes back as events. It keeps a delimiter, a header line and the form field under way, never the
 * content of a file.
 *
 * A line that only begins like a delimiter is content. Lines end in CRLF; other line ends between parts are refused.
 * A part inside a part is content.
 */
class MultipartDecoder {
public:
    static constexpr size_t kLongestBoundary = 70;
    static constexpr size_t kMostParts = 2000;
    static constexpr size_t kMostFiles = 1000;
    /** Lengths in bytes: header lines of one part, name of a field, client's name of a file, all values together. */
    static constexpr size_t kLongestHeaders = 8192;
    static constexpr size_t kLongestName = 63;
    static constexpr size_t kLongestFileName = 490;
    static constexpr size_t kLongestValues = 1048576;

    enum class Event {
        /** All input is taken; more is needed. */
        kMore,
        /** A form field is complete: `Name`, `Value`. */
        kField,
        /** A file begins: `Name`, and its name at the client in `Value`, never empty. */
        kFile,
        /** A piece of the file: `Data`, valid until the input or the decoder changes. */
        kData,
        kFileEnd,
        /** The last delimiter is there; what follows it means nothing. Comes again when asked again. */
        kEnd,
        /** The body is refused, `Problem` says why. Comes again when asked again. */
        kError,
    };

    /** @param boundary has to be one, see `BoundaryOf`. */
    explicit MultipartDecoder(std::string_view boundary);

    /**
     * Takes bytes off the front of `input`, up to the next event. What it views has to stay where it is until the
     * event is kMore.
     */
    Event Next(std::string_view& input);

    const std::string& Name() const { return name; }
    const std::string& Value() const { return value; }
    std::string_view Data() const { return data; }
    /** Null until an error. */
    const char* Problem() const { return problem; }
    /** Whether the last delimiter was taken. */
    bool IsAtEnd() const { return state == State::kEnd; }
    /** Whether the error is one of number or length. */
    bool IsTooLarge() const { return tooLarge; }

    /** The boundary that a content type names; "" unless that is multipart/form-data with a usable one. */
    static std::string BoundaryOf(std::string_view contentType);

private:
    enum class State { kPreamble, kAfterDelimiter, kHeaders, kField, kFile, kNamelessFile, kEnd, kError };

    Event GoOnMatching(std::string_view& input);
    Event Search(std::string_view& input);
    /** What looked like a delimiter is content, and so is what stood behind it. */
    Event GiveUpMatch(std::string_view behind);
    Event AfterDelimiter(std::string_view& input);
    Event Headers(std::string_view& input);
    bool TakeHeader(std::string_view line);
    bool TakeDisposition(std::string_view text);
    Event BeginContent();
    Event Deliver(std::string_view piece);
    Event EndContent();
    Event Refuse(const char* why, bool isTooLarge = false);

    /** CRLF, two dashes and the boundary. */
    std::string delimiter;
    State state = State::kPreamble;
    /** The state in which a delimiter was found. */
    State before = State::kPreamble;
    /** Bytes of the delimiter that were seen, and not delivered as content. The body begins as if behind a CRLF. */
    size_t matched = 2;
    /** How many of them are no bytes of the content in any case. */
    size_t assumed = 2;
    /** What came behind a delimiter, as long as it may still be the rest of its line. */
    std::string tail;
    std::string line;
    size_t headerBytes = 0;
    bool hasDisposition = false;
    bool isFile = false;
    std::string name;
    std::string value;
    std::string held;
    std::string_view data;
    /** The first piece of a file whose beginning was told first. */
    std::string_view pending;
    size_t parts = 0;
    size_t files = 0;
    size_t valueBytes = 0;
    const char* problem = nullptr;
    bool tooLarge = false;
};

}  // namespace reference
