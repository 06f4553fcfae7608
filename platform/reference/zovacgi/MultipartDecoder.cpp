#include "zovacgi/MultipartDecoder.h"

#include <strings.h>

#include <algorithm>
#include <cstring>
#include <utility>

#include "common/WithoutBlanks.h"
#include "webapi/UrlText.h"
#include "zovacgi/HeaderValue.h"

namespace reference {

namespace {

constexpr size_t kLongestPadding = 64;
constexpr const char* kNameless = "unnamed";

bool IsBoundary(std::string_view text) {
    return !text.empty() && text.size() <= MultipartDecoder::kLongestBoundary && text.back() != ' ' &&
           std::all_of(text.begin(), text.end(), [](char byte) { return byte >= ' ' && byte <= '~'; });
}

bool HasName(std::string_view line, std::string_view header) {
    return line.size() > header.size() && line[header.size()] == ':' &&
           strncasecmp(line.data(), header.data(), header.size()) == 0;
}

/** The name in the form charset'language'percent-encoded text. False for another charset than UTF-8. */
bool ExtendedName(std::string_view text, std::string& out) {
    constexpr std::string_view kCharset = "utf-8'";
    const size_t second = text.find('\'', kCharset.size());
    if (text.size() < kCharset.size() || strncasecmp(text.data(), kCharset.data(), kCharset.size()) != 0 ||
        second == std::string_view::npos) {
        return false;
    }
    out = PercentDecode(text.substr(second + 1), false);
    return true;
}

}  // namespace

MultipartDecoder::MultipartDecoder(std::string_view boundary) : delimiter("\r\n--" + std::string(boundary)) {}

std::string MultipartDecoder::BoundaryOf(std::string_view contentType) {
    HeaderValue type;
    if (!ParseHeaderValue(contentType, type) || type.word != "multipart/form-data") {
        return "";
    }
    const std::string* boundary = type.Find("boundary");
    return boundary != nullptr && IsBoundary(*boundary) ? *boundary : "";
}

MultipartDecoder::Event MultipartDecoder::Next(std::string_view& input) {
    if (!pending.empty()) {
        data = std::exchange(pending, std::string_view());
        return Event::kData;
    }
    Event event = Event::kMore;
    while (event == Event::kMore) {
        if (state == State::kEnd) {
            return Event::kEnd;
        }
        if (state == State::kError) {
            return Event::kError;
        }
        if (input.empty()) {
            return Event::kMore;
        }
        if (state == State::kAfterDelimiter) {
            event = AfterDelimiter(input);
        } else if (state == State::kHeaders) {
            event = Headers(input);
        } else {
            event = matched > 0 ? GoOnMatching(input) : Search(input);
        }
    }
    return event;
}

MultipartDecoder::Event MultipartDecoder::GoOnMatching(std::string_view& input) {
    const std::string_view expected = std::string_view(delimiter).substr(matched);
    const size_t length = std::min(expected.size(), input.size());
    size_t same = 0;
    while (same < length && input[same] == expected[same]) {
        ++same;
    }
    input.remove_prefix(same);
    matched += same;
    if (same < length) {
        // CR stands at the delimiter's beginning alone, so nothing inside the matched part can begin another.
        return GiveUpMatch("");
    }
    if (matched == delimiter.size()) {
        before = std::exchange(state, State::kAfterDelimiter);
        tail.clear();
    }
    return Event::kMore;
}

MultipartDecoder::Event MultipartDecoder::Search(std::string_view& input) {
    const void* found = memmem(input.data(), input.size(), delimiter.data(), delimiter.size());
    size_t length = input.size();
    if (found != nullptr) {
        length = static_cast<size_t>(static_cast<const char*>(found) - input.data());
    } else {
        const size_t last = input.rfind('\r');
        if (last != std::string_view::npos && input.size() - last < delimiter.size() &&
            delimiter.compare(0, input.size() - last, input.substr(last)) == 0) {
            length = last;
        }
    }
    const std::string_view piece = input.substr(0, length);
    input.remove_prefix(length);
    if (!input.empty()) {
        input.remove_prefix(1);
        matched = 1;
    }
    return Deliver(piece);
}

MultipartDecoder::Event MultipartDecoder::GiveUpMatch(std::string_view behind) {
    held.assign(delimiter, assumed, matched - assumed);
    held += behind;
    matched = 0;
    assumed = 0;
    return Deliver(held);
}

MultipartDecoder::Event MultipartDecoder::AfterDelimiter(std::string_view& input) {
    while (!input.empty()) {
        const char byte = input.front();
        const char last = tail.empty() ? '\0' : tail.back();
        if (last == '\r' && byte == '\n') {
            input.remove_prefix(1);
            return EndContent();
        }
        if (tail == "-" && byte == '-') {
            input.remove_prefix(1);
            tail += byte;
            return EndContent();
        }
        const bool fits = (tail.empty() && byte == '-') ||
                          ((byte == ' ' || byte == '\t' || byte == '\r') && last != '\r' && tail != "-");
        if (!fits || tail.size() >= kLongestPadding) {
            if (byte == '\n' && before == State::kPreamble) {
                return Refuse("lines of a multipart body end in CRLF");
            }
            state = before;
            return GiveUpMatch(tail);
        }
        tail += byte;
        input.remove_prefix(1);
    }
    return Event::kMore;
}

MultipartDecoder::Event MultipartDecoder::EndContent() {
    const bool isLast = tail == "--";
    state = isLast ? State::kEnd : State::kHeaders;
    matched = 0;
    assumed = 0;
    headerBytes = 0;
    hasDisposition = false;
    isFile = false;
    line.clear();
    switch (before) {
        case State::kField:
        case State::kNamelessFile:
            return Event::kField;
        case State::kFile:
            return Event::kFileEnd;
        default:
            return Event::kMore;
    }
}

MultipartDecoder::Event MultipartDecoder::Headers(std::string_view& input) {
    while (!input.empty()) {
        const char byte = input.front();
        const bool endsLine = byte == '\n' && !line.empty() && line.back() == '\r';
        if (++headerBytes > kLongestHeaders) {
            return Refuse("the header lines of a part are too long", true);
        }
        if (byte == '\0' || (byte == '\n' && !endsLine) || (byte != '\n' && !line.empty() && line.back() == '\r')) {
            return Refuse("header lines of a part end in CRLF");
        }
        input.remove_prefix(1);
        if (!endsLine) {
            line += byte;
            continue;
        }
        line.pop_back();
        if (line.empty()) {
            return BeginContent();
        }
        if (!TakeHeader(line)) {
            return Event::kError;
        }
        line.clear();
    }
    return Event::kMore;
}

bool MultipartDecoder::TakeHeader(std::string_view text) {
    if (text.front() == ' ' || text.front() == '\t' || text.find(':') == std::string_view::npos) {
        Refuse("a header line of a part is none");
        return false;
    }
    const std::string_view content = text.substr(text.find(':') + 1);
    if (HasName(text, "Content-Disposition")) {
        return TakeDisposition(content);
    }
    if (HasName(text, "Content-Transfer-Encoding")) {
        HeaderValue encoding;
        if (!ParseHeaderValue(content, encoding) ||
            (encoding.word != "binary" && encoding.word != "8bit" && encoding.word != "7bit")) {
            Refuse("a part has a transfer encoding");
            return false;
        }
    }
    return true;
}

bool MultipartDecoder::TakeDisposition(std::string_view text) {
    HeaderValue disposition;
    if (hasDisposition || !ParseHeaderValue(text, disposition) || disposition.word != "form-data" ||
        disposition.Find("name") == nullptr || disposition.Find("name")->empty()) {
        Refuse("a part does not say which field it is");
        return false;
    }
    hasDisposition = true;
    name = FormName(*disposition.Find("name"));
    value.clear();
    if (const std::string* fileName = disposition.Find("filename")) {
        isFile = true;
        value = FormName(*fileName);
    } else if (const std::string* extended = disposition.Find("filename*")) {
        isFile = true;
        if (!ExtendedName(*extended, value) || value.find('\0') != std::string::npos) {
            Refuse("a part has a file name that cannot be read");
            return false;
        }
    }
    if (name.size() > kLongestName || value.size() > kLongestFileName) {
        Refuse("the name of a part is too long", true);
        return false;
    }
    return true;
}

MultipartDecoder::Event MultipartDecoder::BeginContent() {
    if (!hasDisposition) {
        return Refuse("a part does not say which field it is");
    }
    if (++parts > kMostParts || (isFile && ++files > kMostFiles)) {
        return Refuse("the body has too many parts", true);
    }
    // The CRLF in front of the content may already be the one of the next delimiter.
    matched = 2;
    assumed = 2;
    if (!isFile) {
        state = State::kField;
        return Event::kMore;
    }
    state = value.empty() ? State::kNamelessFile : State::kFile;
    return value.empty() ? Event::kMore : Event::kFile;
}

MultipartDecoder::Event MultipartDecoder::Deliver(std::string_view piece) {
    if (piece.empty() || state == State::kPreamble) {
        return Event::kMore;
    }
    if (state == State::kFile) {
        data = piece;
        return Event::kData;
    }
    if (state == State::kNamelessFile) {
        state = State::kFile;
        value = kNameless;
        pending = piece;
        return Event::kFile;
    }
    valueBytes += piece.size();
    if (valueBytes > kLongestValues) {
        return Refuse("the form fields are too long", true);
    }
    if (piece.find('\0') != std::string_view::npos) {
        return Refuse("a form field holds a zero byte");
    }
    value += piece;
    return Event::kMore;
}

MultipartDecoder::Event MultipartDecoder::Refuse(const char* why, bool isTooLarge) {
    state = State::kError;
    problem = why;
    tooLarge = isTooLarge;
    return Event::kError;
}

}  // namespace reference
