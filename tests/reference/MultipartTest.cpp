#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "zovacgi/HeaderValue.h"
#include "zovacgi/MultipartDecoder.h"

using reference::FormName;
using reference::HeaderValue;
using reference::MultipartDecoder;
using reference::ParseHeaderValue;
using Event = MultipartDecoder::Event;

namespace {

/** A part's header lines, up to its content. */
std::string Head(const std::string& parameters) {
    return "Content-Disposition: form-data; " + parameters + "\r\n\r\n";
}

const std::string kLine = "--b\r\n";

std::string Field(const std::string& name, const std::string& value) {
    return kLine + Head("name=\"" + name + "\"") + value + "\r\n";
}

std::string File(const std::string& name, const std::string& fileName, const std::string& content) {
    return kLine + Head("name=\"" + name + "\"; filename=\"" + fileName + "\"") + content + "\r\n";
}

/** What comes out of a body that is pushed in pieces of these lengths, the last one again and again. */
std::string Decoded(const std::string& body, const std::vector<size_t>& pieces = {std::string::npos},
                    const std::string& boundary = "b") {
    MultipartDecoder decoder(boundary);
    std::string out;
    size_t at = 0;
    size_t piece = 0;
    std::string_view input;
    for (;;) {
        switch (decoder.Next(input)) {
            case Event::kMore: {
                EXPECT_TRUE(input.empty());
                if (at == body.size()) {
                    return out + "more";
                }
                const size_t length = pieces[std::min(piece++, pieces.size() - 1)];
                input = std::string_view(body).substr(at, length);
                at += input.size();
                break;
            }
            case Event::kField:
                out += decoder.Name() + "=" + decoder.Value() + "|";
                break;
            case Event::kFile:
                out += decoder.Name() + "<" + decoder.Value() + ">";
                break;
            case Event::kData:
                EXPECT_FALSE(decoder.Data().empty());
                out += decoder.Data();
                break;
            case Event::kFileEnd:
                out += "|";
                break;
            case Event::kEnd:
                return out + "end";
            case Event::kError:
                EXPECT_NE(decoder.Problem(), nullptr);
                return out + (decoder.IsTooLarge() ? "too large" : "malformed");
        }
    }
}

struct Row {
    const char* name;
    std::string body;
    std::string expected;
};

const std::vector<Row>& Bodies() {
    static const std::vector<Row> rows = {
        {"no part at all", "--b--\r\n", "end"},
        {"a field", Field("a", "1") + "--b--\r\n", "a=1|end"},
        {"a last line without its end", Field("a", "1") + "--b--", "a=1|end"},
        {"an empty field", Field("a", "") + "--b--\r\n", "a=|end"},
        {"an empty field whose content has no line of its own", kLine + Head("name=a") + "--b--", "a=|end"},
        {"a content that nearly is such a field", kLine + Head("name=a") + "--c\r\n--b--", "a=--c|end"},
        {"a content that begins with a line end", Field("a", "\r\n1") + "--b--", "a=\r\n1|end"},
        {"a content that ends with line ends", Field("a", "1\r\n\r\n") + "--b--", "a=1\r\n\r\n|end"},
        {"two parts of one name", Field("a", "1") + Field("a", "2") + "--b--", "a=1|a=2|end"},
        {"a file", File("f", "x.txt", "data") + "--b--", "f<x.txt>data|end"},
        {"an empty file", File("f", "x.txt", "") + "--b--", "f<x.txt>|end"},
        {"no file chosen", File("f", "", "") + "--b--", "f=|end"},
        {"a file without a name", File("f", "", "data") + "--b--", "f<unnamed>data|end"},
        {"a file with a zero byte", File("f", "x", std::string("a\0b", 3)) + "--b--", std::string("f<x>a\0b|end", 11)},
        {"lone line ends in a file", File("f", "x", "\r\r\n\n\r-\r\n-\r\n--\r\n--c\r") + "--b--",
         "f<x>\r\r\n\n\r-\r\n-\r\n--\r\n--c\r|end"},
        {"a line that begins as a delimiter", File("f", "x", "\r\n--bc\r\n--b-c\r\n--b x\r\n--b \r \r") + "--b--",
         "f<x>\r\n--bc\r\n--b-c\r\n--b x\r\n--b \r \r|end"},
        {"a delimiter in lines that end in LF", File("f", "x", "1\n--b\n--b--\n2") + "--b--",
         "f<x>1\n--b\n--b--\n2|end"},
        {"a delimiter behind a CR too many", File("f", "x", "1\r") + "--b--", "f<x>1\r|end"},
        {"blanks behind a delimiter", "--b \t\r\n" + Head("name=a") + "1\r\n--b  \r\n" + Head("name=c") + "2\r\n--b--",
         "a=1|c=2|end"},
        {"preamble and epilogue", "a preamble\r\n--bx\r\n" + Field("a", "1") + "--b--\r\n--b\r\nname=z\r\n", "a=1|end"},
        {"a part inside a part",
         "--b\r\nContent-Disposition: form-data; name=\"f\"; filename=\"m\"\r\n"
         "Content-Type: multipart/mixed; boundary=i\r\n\r\n--i\r\n\r\n1\r\n--i--\r\n--b--",
         "f<m>--i\r\n\r\n1\r\n--i--|end"},
        {"further header lines in any case",
         "--b\r\ncontent-type: text/plain\r\nCONTENT-DISPOSITION:form-data;NAME=a\r\nX-Y:\r\n"
         "Content-Transfer-Encoding: Binary\r\n\r\n1\r\n--b--",
         "a=1|end"},
        {"names with escapes",
         kLine + Head(R"(name="a%22%0D%0A\"\\\n"; filename="C:\dir\x; y=\"1\".txt")") + "1\r\n--b--",
         "a\"\r\n\"\\\\n<C:\\dir\\x; y=\"1\".txt>1|end"},
        {"other percent signs stay", Field("100%25 %2", "1") + "--b--", "100%25 %2=1|end"},
        {"names beyond ASCII", File("größe", "😀/../x", "1") + "--b--", "größe<😀/../x>1|end"},
        {"an encoded file name", kLine + Head("name=f; filename*=UTF-8'de'%e2%82%ac%20x") + "1\r\n--b--",
         "f<€ x>1|end"},
        {"a plain file name beside an encoded one",
         kLine + Head("name=f; filename=plain; filename*=UTF-8''other") + "1\r\n--b--", "f<plain>1|end"},

        {"nothing", "", "more"},
        {"no last delimiter", Field("a", "1"), "more"},
        {"a file that breaks off", kLine + Head("name=f; filename=x") + "1234\r\n--", "f<x>1234more"},
        {"lines that end in LF", "--b\nContent-Disposition: form-data; name=a\n\n1\n--b--\n", "malformed"},
        {"header lines that end in LF", "--b\r\nContent-Disposition: form-data; name=a\n\n1\r\n--b--", "malformed"},
        {"a lone CR in a header line", kLine + "X: 1\r2\r\n" + Head("name=a") + "1\r\n--b--", "malformed"},
        {"a zero byte in a header line", kLine + Head(std::string("name=\"a\0b\"", 10)) + "1\r\n--b--", "malformed"},
        {"a part without header lines", "--b\r\n\r\n1\r\n--b--", "malformed"},
        {"a part without a name", kLine + Head("filename=x") + "1\r\n--b--", "malformed"},
        {"an empty name", Field("", "1") + "--b--", "malformed"},
        {"another disposition", "--b\r\nContent-Disposition: attachment; name=a\r\n\r\n1\r\n--b--", "malformed"},
        {"two dispositions", kLine + "Content-Disposition: form-data; name=a\r\n" + Head("name=c") + "1\r\n--b--",
         "malformed"},
        {"two names", kLine + Head("name=a; name=c") + "1\r\n--b--", "malformed"},
        {"a quote that is not closed", kLine + Head("name=\"a") + "1\r\n--b--", "malformed"},
        {"text behind a quote", kLine + Head("name=\"a\"c") + "1\r\n--b--", "malformed"},
        {"a folded header line", "--b\r\nContent-Disposition: form-data;\r\n name=a\r\n\r\n1\r\n--b--", "malformed"},
        {"a header line that is none", kLine + "hello\r\n" + Head("name=a") + "1\r\n--b--", "malformed"},
        {"a transfer encoding", kLine + "Content-Transfer-Encoding: base64\r\n" + Head("name=a") + "MQ==\r\n--b--",
         "malformed"},
        {"an encoded name of another charset", kLine + Head("name=f; filename*=latin1''x") + "1\r\n--b--", "malformed"},
        {"an encoded zero byte", kLine + Head("name=f; filename*=utf-8''x%00y") + "1\r\n--b--", "malformed"},
        {"a zero byte in a field", Field("a", std::string("1\0", 2)) + "--b--", "malformed"},
        {"a name that is too long", Field(std::string(64, 'n'), "1") + "--b--", "too large"},
        {"a file name that is too long", File("f", std::string(491, 'n'), "1") + "--b--", "too large"},
    };
    return rows;
}

}  // namespace

TEST(MultipartDecoder, ReadsGoodBodiesAndRefusesBadOnes) {
    for (const Row& row : Bodies()) {
        EXPECT_EQ(Decoded(row.body), row.expected) << row.name;
    }
}

TEST(MultipartDecoder, GivesTheSameHoweverTheBodyIsCutInTwo) {
    for (const Row& row : Bodies()) {
        for (size_t first = 1; first < row.body.size(); ++first) {
            EXPECT_EQ(Decoded(row.body, {first, std::string::npos}), row.expected) << row.name << ", " << first;
        }
    }
}

TEST(MultipartDecoder, GivesTheSameForPiecesOfAnyLength) {
    for (const Row& row : Bodies()) {
        for (size_t length = 1; length < 9; ++length) {
            EXPECT_EQ(Decoded(row.body, {length}), row.expected) << row.name << ", " << length;
        }
    }
}

TEST(MultipartDecoder, TakesNoByteBehindTheOneThatMadeAnEvent) {
    const std::string body = Field("a", "1") + Field("c", "2") + "--b--";
    MultipartDecoder decoder("b");
    std::string_view input = body;
    EXPECT_EQ(decoder.Next(input), Event::kField);
    EXPECT_EQ(input, body.substr(Field("a", "1").size() + 5));
}

TEST(MultipartDecoder, StaysWithItsEndAndWithItsError) {
    for (const auto& [body, event] : {std::pair("--b--", Event::kEnd), std::pair("--b\n", Event::kError)}) {
        MultipartDecoder decoder("b");
        std::string_view input = body;
        EXPECT_EQ(decoder.Next(input), event);
        input = "\r\n--b\r\nmore";
        EXPECT_EQ(decoder.Next(input), event);
        EXPECT_EQ(input, "\r\n--b\r\nmore");
    }
}

TEST(MultipartDecoder, TakesTwoThousandPartsAndAThousandFilesAndNoMore) {
    std::string fields;
    for (int i = 0; i < 2000; ++i) {
        fields += Field("n", "");
    }
    std::string files;
    for (int i = 0; i < 1000; ++i) {
        files += File("n", "x", "");
    }
    const auto end = [](const std::string& body) {
        const std::string out = Decoded(body);
        return out.substr(out.rfind('|') + 1);
    };
    EXPECT_EQ(end(fields + "--b--"), "end");
    EXPECT_EQ(end(fields + Field("n", "") + "--b--"), "too large");
    EXPECT_EQ(end(files + Field("n", "") + "--b--"), "end");
    EXPECT_EQ(end(files + File("n", "x", "") + "--b--"), "too large");
}

TEST(MultipartDecoder, StopsAtTheFirstPartTooManyHoweverManyFollow) {
    std::string fields;
    for (int i = 0; i < 100000; ++i) {
        fields += Field("n", "v");
    }
    MultipartDecoder decoder("b");
    std::string_view input = fields;
    int seen = 0;
    while (decoder.Next(input) == Event::kField) {
        ++seen;
    }
    EXPECT_EQ(seen, 2000);
    EXPECT_TRUE(decoder.IsTooLarge());
    EXPECT_EQ(input.size(), fields.size() - 2001 * Field("n", "v").size() + 3);
}

TEST(MultipartDecoder, LimitsNamesHeaderLinesAndValues) {
    const std::string rest = "--b--";
    EXPECT_EQ(Decoded(Field(std::string(63, 'n'), "1") + rest), std::string(63, 'n') + "=1|end");
    const std::string longName(490, 'n');
    EXPECT_EQ(Decoded(File("f", longName, "1") + rest), "f<" + longName + ">1|end");

    const size_t fixed = Head("name=a").size() + std::string("X: \r\n").size();
    const auto padded = [&](size_t length) {
        return kLine + "X: " + std::string(length - fixed, 'x') + "\r\n" + Head("name=a") + "1\r\n" + rest;
    };
    EXPECT_EQ(Decoded(padded(8192)), "a=1|end");
    EXPECT_EQ(Decoded(padded(8193)), "too large");
    EXPECT_EQ(Decoded(kLine + "X: " + std::string(1048576, 'x')), "too large");

    const std::string half(524288, 'v');
    EXPECT_EQ(Decoded(Field("a", half) + Field("c", half) + rest), "a=" + half + "|c=" + half + "|end");
    EXPECT_EQ(Decoded(Field("a", half) + Field("c", half + "v") + rest), "a=" + half + "|too large");
    EXPECT_EQ(Decoded(Field("a", std::string(1048577, 'v'))), "too large");
}

TEST(MultipartDecoder, FindsTheBoundaryThatAContentTypeNames) {
    const std::string longest(70, 'b');
    const std::pair<std::string, std::string> rows[] = {
        {"multipart/form-data; boundary=abc", "abc"},
        {"Multipart/Form-Data;Boundary=\"a b'()+_,-./:=?\"", "a b'()+_,-./:=?"},
        {"multipart/form-data; charset=utf-8; boundary=----WebKitFormBoundaryX1 ", "----WebKitFormBoundaryX1"},
        {"multipart/form-data; boundary=" + longest, longest},
        {"multipart/form-data; boundary=" + longest + "b", ""},
        {"multipart/form-data; boundary=", ""},
        {"multipart/form-data; boundary=\"\"", ""},
        {"multipart/form-data; boundary=\"a \"", ""},
        {"multipart/form-data; boundary=\"a\r\nb\"", ""},
        {"multipart/form-data; boundary=a\x80", ""},
        {"multipart/form-data; boundary=a; boundary=b", ""},
        {"multipart/form-data", ""},
        {"multipart/mixed; boundary=a", ""},
        {"text/plain; x=multipart/form-data; boundary=a", ""},
        {"", ""},
    };
    for (const auto& [type, boundary] : rows) {
        EXPECT_EQ(MultipartDecoder::BoundaryOf(type), boundary) << type;
    }
}

TEST(MultipartDecoder, WorksWithTheLongestBoundary) {
    const std::string boundary(70, '-');
    const std::string body = "--" + boundary + "\r\n" + Head("name=f; filename=x") + "1\r\n--" + boundary.substr(1) +
                             "\r\n--" + boundary + "--";
    EXPECT_EQ(Decoded(body, {1}, boundary), "f<x>1\r\n--" + boundary.substr(1) + "|end");
    EXPECT_EQ(Decoded(body, {std::string::npos}, boundary), "f<x>1\r\n--" + boundary.substr(1) + "|end");
}

TEST(HeaderValue, RefusesMoreThanSixteenParameters) {
    std::string text = "word";
    for (int i = 0; i < 16; ++i) {
        text.append("; p").append(std::to_string(i)).append("=1");
    }
    HeaderValue value;
    EXPECT_TRUE(ParseHeaderValue(text + ";", value));
    EXPECT_EQ(value.parameters.size(), 16u);
    EXPECT_FALSE(ParseHeaderValue(text + "; p16=1", value));
    EXPECT_FALSE(ParseHeaderValue("; a=1", value));
}

TEST(HeaderValue, TurnsOnlyTheEscapesOfBrowsersBack) {
    EXPECT_EQ(FormName("%22%0D%0A%0d%0a%20%2g%2"), "\"\r\n\r\n%20%2g%2");
    EXPECT_EQ(FormName("%2%22"), "%2\"");
}
