// The multipart decoder: a body gives the same parts however it is cut into pieces, and every limit holds. The first
// two bytes say how it is cut, the rest is the body, with the boundary "b".

#include <algorithm>

#include "Check.h"
#include "Target.h"
#include "zovacgi/MultipartDecoder.h"

namespace {

using reference::MultipartDecoder;
using Event = MultipartDecoder::Event;

struct Outcome {
    std::string events;
    size_t parts = 0;
    bool refused = false;
};

bool IsComing(Event event) {
    return event != Event::kEnd && event != Event::kError;
}

void Note(Outcome& outcome, char kind, const std::string& name, const std::string& value) {
    FUZZ_CHECK(!name.empty() && name.size() <= MultipartDecoder::kLongestName);
    FUZZ_CHECK(name.find('\0') == std::string::npos && value.find('\0') == std::string::npos);
    outcome.events += kind + name + '\0' + value + '\0';
    ++outcome.parts;
}

Outcome Decode(const std::string& body, size_t first, size_t others) {
    MultipartDecoder decoder("b");
    Outcome outcome;
    size_t at = 0;
    bool inFile = false;
    std::string piece;
    std::string_view input;
    for (Event event = decoder.Next(input);; event = decoder.Next(input)) {
        FUZZ_CHECK(inFile == (event == Event::kData || event == Event::kFileEnd) || event == Event::kMore ||
                   !IsComing(event));
        if (event == Event::kMore) {
            FUZZ_CHECK(input.empty());
            if (at == body.size()) {
                return outcome;
            }
            // A copy of its own, so that a byte beyond the piece is noticed.
            piece = body.substr(at, at == 0 ? first : others);
            piece.shrink_to_fit();
            input = piece;
            at += piece.size();
        } else if (event == Event::kField) {
            FUZZ_CHECK(decoder.Value().size() <= MultipartDecoder::kLongestValues);
            Note(outcome, 'v', decoder.Name(), decoder.Value());
        } else if (event == Event::kFile) {
            FUZZ_CHECK(!decoder.Value().empty() && decoder.Value().size() <= MultipartDecoder::kLongestFileName);
            Note(outcome, 'f', decoder.Name(), decoder.Value());
            inFile = true;
        } else if (event == Event::kData) {
            FUZZ_CHECK(!decoder.Data().empty());
            outcome.events += decoder.Data();
        } else if (event == Event::kFileEnd) {
            outcome.events += '\0';
            inFile = false;
        } else {
            outcome.refused = event == Event::kError;
            FUZZ_CHECK(outcome.refused == (decoder.Problem() != nullptr));
            FUZZ_CHECK(decoder.Next(input) == event);
            return outcome;
        }
    }
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size < 2) {
        return 0;
    }
    const size_t first = data[0] + 1u;
    const size_t others = data[1] + 1u;
    const std::string body = fuzz::TextOf(data + 2, size - 2);
    const Outcome whole = Decode(body, std::max<size_t>(body.size(), 1), 1);
    FUZZ_CHECK(whole.parts <= MultipartDecoder::kMostParts);
    for (const auto& [one, more] : {std::pair(first, others), std::pair<size_t, size_t>(1, 1)}) {
        const Outcome cut = Decode(body, one, more);
        FUZZ_CHECK(cut.refused == whole.refused && cut.parts == whole.parts && cut.events == whole.events);
    }

    const std::string boundary = MultipartDecoder::BoundaryOf(body);
    FUZZ_CHECK(boundary.size() <= MultipartDecoder::kLongestBoundary);
    FUZZ_CHECK(boundary.find_first_of("\r\n") == std::string::npos);
    return 0;
}
