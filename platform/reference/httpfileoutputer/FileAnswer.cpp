#include "httpfileoutputer/FileAnswer.h"

#include <cstdlib>
#include <cstring>
#include <vector>

#include "common/Hex.h"
#include "common/RandomBytes.h"
#include "httpfileoutputer/ByteRanges.h"
#include "httpfileoutputer/FastOutput.h"
#include "httpfileoutputer/HttpDate.h"

namespace reference {

namespace {

constexpr const char* kLineEnd = "\r\n";

std::string_view Variable(const char* name) {
    const char* value = getenv(name);
    return value == nullptr ? std::string_view() : std::string_view(value);
}

std::string Line(const char* name, const std::string& value) {
    return value.empty() ? "" : std::string(name) + ": " + value + kLineEnd;
}

std::string FileLines(const FileContent& content) {
    std::string lines = Line("Accept-Ranges", "bytes") + Line("ETag", content.validators.tag);
    if (content.validators.isSettled) {
        lines += Line("Last-Modified", HttpDateText(content.validators.modified));
    }
    return lines;
}

std::string RangeText(const ByteRange& range, std::uint64_t size) {
    return "bytes " + std::to_string(range.first) + "-" + std::to_string(range.first + range.length - 1) + "/" +
           std::to_string(size);
}

bool SendWhole(ClientOutput& client, const FileRequest& request, const FileContent& content) {
    const std::string lines = ContentLines(content.type, content.disposition) + FileLines(content);
    // A web server would judge ranges and conditions once more, by validators of its own.
    const bool canLeave = request.isGet && request.range.empty() && request.conditions.AreNone() && content.size > 0;
    const std::string fast = canLeave ? FastOutputLine(content.file) : "";
    if (!fast.empty()) {
        return client.Write(lines + fast + kLineEnd + kLineEnd);
    }
    return client.Write(lines + Line("Content-Length", std::to_string(content.size)) + kLineEnd) &&
           (request.isHead || client.SendFile(content.file, 0, content.size));
}

bool SendOneRange(ClientOutput& client, const FileContent& content, const ByteRange& range) {
    return client.Write(Line("Status", "206 Partial Content") + ContentLines(content.type, content.disposition) +
                        FileLines(content) + Line("Content-Range", RangeText(range, content.size)) +
                        Line("Content-Length", std::to_string(range.length)) + kLineEnd) &&
           client.SendFile(content.file, range.first, range.length);
}

bool SendRanges(ClientOutput& client, const FileContent& content, const std::vector<ByteRange>& ranges) {
    char random[16];
    if (!FillRandom(random, sizeof(random))) {
        return false;
    }
    const std::string boundary = HexText(std::string_view(random, sizeof(random)));
    const std::string end = "\r\n--" + boundary + "--\r\n";
    std::vector<std::string> heads;
    std::uint64_t length = end.size();
    for (const ByteRange& range : ranges) {
        heads.push_back("\r\n--" + boundary + kLineEnd + Line("Content-Type", content.type) +
                        Line("Content-Range", RangeText(range, content.size)) + kLineEnd);
        length += heads.back().size() + range.length;
    }
    if (!client.Write(Line("Status", "206 Partial Content") +
                      ContentLines("multipart/byteranges; boundary=" + boundary, content.disposition) +
                      FileLines(content) + Line("Content-Length", std::to_string(length)) + kLineEnd)) {
        return false;
    }
    for (size_t i = 0; i < ranges.size(); ++i) {
        if (!client.Write(heads[i]) || !client.SendFile(content.file, ranges[i].first, ranges[i].length)) {
            return false;
        }
    }
    return client.Write(end);
}

}  // namespace

FileRequest FileRequest::OfEnvironment() {
    FileRequest request;
    const std::string_view method = Variable("REQUEST_METHOD");
    request.isGet = method == "GET";
    request.isHead = method == "HEAD";
    if (request.isGet) {
        request.range = Variable("HTTP_RANGE");
    }
    if (request.isGet || request.isHead) {
        request.conditions = {Variable("HTTP_IF_MATCH"), Variable("HTTP_IF_NONE_MATCH"),
                              Variable("HTTP_IF_MODIFIED_SINCE"), Variable("HTTP_IF_UNMODIFIED_SINCE"),
                              Variable("HTTP_IF_RANGE")};
    }
    return request;
}

std::string ContentLines(const std::string& type, const std::string& disposition) {
    // What a login has opened is no other visitor's, and a browser is not to guess a page out of a file.
    return Line("Content-Type", type) + Line("Content-Disposition", disposition) +
           Line("Cache-Control", "private, no-cache") + Line("X-Content-Type-Options", "nosniff");
}

bool SendFileAnswer(ClientOutput& client, const FileRequest& request, const FileContent& content, time_t now) {
    switch (Judge(request.conditions, content.validators, now)) {
        case Verdict::kNotModified:
            return client.Write(Line("Status", "304 Not Modified") + Line("Cache-Control", "private, no-cache") +
                                FileLines(content) + kLineEnd);
        case Verdict::kFailed:
            return client.Write(Line("Status", "412 Precondition Failed") + Line("Content-Length", "0") + kLineEnd);
        case Verdict::kSend:
            break;
    }
    std::vector<ByteRange> ranges;
    const bool wantsRanges = !request.range.empty() && AllowsRange(request.conditions, content.validators, now);
    switch (wantsRanges ? ReadRanges(request.range, content.size, ranges) : RangeResult::kWhole) {
        case RangeResult::kWhole:
            return SendWhole(client, request, content);
        case RangeResult::kUnsatisfiable:
            return client.Write(Line("Status", "416 Range Not Satisfiable") +
                                Line("Content-Range", "bytes */" + std::to_string(content.size)) +
                                Line("Content-Length", "0") + kLineEnd);
        case RangeResult::kRanges:
            break;
    }
    return ranges.size() == 1 ? SendOneRange(client, content, ranges.front()) : SendRanges(client, content, ranges);
}

}  // namespace reference
