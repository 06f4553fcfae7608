#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>

#include "PrivateDevice.h"
#include "common/Utf8.h"
#include "httpfileoutputer.h"
#include "httpfileoutputer/ContentDisposition.h"
#include "httpfileoutputer/MimeTypes.h"

using reference::AttachmentNamed;

namespace {

// ---- UTF-8 ----

TEST(Utf8, TellsWhatACharacterIs) {
    const std::pair<std::string, size_t> rows[] = {
        {"", 0},
        {"a", 1},
        {std::string(1, '\0'), 1},
        {"\x7f", 1},
        {"\x80", 0},
        {"\xbf", 0},
        {"\xc0\x80", 0},
        {"\xc1\xbf", 0},
        {"\xc2\x80", 2},
        {"\xdf\xbf", 2},
        {"\xc2", 0},
        {"\xc2z", 0},
        {"\xe0\x9f\xbf", 0},
        {"\xe0\xa0\x80", 3},
        {"\xed\x9f\xbf", 3},
        {"\xef\xbf\xbf", 3},
        {"\xed\xa0\x80", 0},
        {"\xe2\x82", 0},
        {"\xe2\x82z", 0},
        {"\xf0\x8f\xbf\xbf", 0},
        {"\xf0\x90\x80\x80", 4},
        {"\xf4\x8f\xbf\xbf", 4},
        {"\xf4\x90\x80\x80", 0},
        {"\xf5\x80\x80\x80", 0},
        {"\xff", 0},
        {"\xf0\x9f\x98", 0},
        {"\xf0\x9f\x98\x80tail", 4},
    };
    for (const auto& [text, length] : rows) {
        EXPECT_EQ(reference::Utf8CharacterLength(text), length) << testing::PrintToString(text);
        EXPECT_EQ(reference::IsUtf8(text), text.empty() || length > 0) << testing::PrintToString(text);
    }
    EXPECT_FALSE(reference::IsUtf8("good\xff"));
}

// ---- names for the client ----

TEST(AttachmentName, IsTheLastPartOfThePath) {
    EXPECT_EQ(AttachmentNamed("/volume1/a/report.pdf"), "attachment; filename=\"report.pdf\"");
    EXPECT_EQ(AttachmentNamed("report.pdf"), "attachment; filename=\"report.pdf\"");
    EXPECT_EQ(AttachmentNamed("/a b;c='d'"), "attachment; filename=\"a b;c='d'\"");
}

TEST(AttachmentName, IsNoneWhereThePathHasNone) {
    for (const char* path : {"", "/", "/a/", ".", "..", "/a/..", "/."}) {
        EXPECT_EQ(AttachmentNamed(path), "") << path;
    }
}

TEST(AttachmentName, BeyondAsciiIsGivenTwice) {
    EXPECT_EQ(AttachmentNamed("/\xe2\x82\xac rates.txt"),
              "attachment; filename=\"_ rates.txt\"; filename*=UTF-8''%E2%82%AC%20rates.txt");
    EXPECT_EQ(AttachmentNamed("\xf0\x9f\x98\x80"), "attachment; filename=\"_\"; filename*=UTF-8''%F0%9F%98%80");
    EXPECT_EQ(AttachmentNamed("100%41"), "attachment; filename=\"100%41\"; filename*=UTF-8''100%2541");
}

TEST(AttachmentName, NoByteBreaksOutOfIt) {
    EXPECT_EQ(AttachmentNamed("a\r\nSet-Cookie: x=1"), "attachment; filename=\"a__Set-Cookie: x=1\"");
    EXPECT_EQ(AttachmentNamed("a\".exe"), "attachment; filename=\"a_.exe\"; filename*=UTF-8''a%22.exe");
    EXPECT_EQ(AttachmentNamed("a\\\"; filename=b"),
              "attachment; filename=\"a__; filename=b\"; filename*=UTF-8''a_%22%3B%20filename%3Db");
    EXPECT_EQ(AttachmentNamed("..\\..\\x"), "attachment; filename=\".._.._x\"");
    EXPECT_EQ(AttachmentNamed("a\xff\xc3"), "attachment; filename=\"a__\"");
    EXPECT_EQ(AttachmentNamed(std::string("a\0b", 3)), "attachment; filename=\"a_b\"");
    std::string all;
    for (int byte = 0; byte < 256; ++byte) {
        if (byte != '/') {
            all += static_cast<char>(byte);
        }
    }
    const std::string value = AttachmentNamed(all);
    for (const char byte : value) {
        EXPECT_TRUE(byte >= 0x20 && byte < 0x7f) << static_cast<int>(byte);
    }
    EXPECT_EQ(std::count(value.begin(), value.end(), '"'), 2);
    EXPECT_EQ(std::count(value.begin(), value.end(), '\\'), 0);
}

TEST(AttachmentName, IsNoLongerThanAFileNameCanBe) {
    EXPECT_EQ(AttachmentNamed(std::string(100'000, 'a')), "attachment; filename=\"" + std::string(255, 'a') + "\"");
    // Cut within a character, of which "_" remains.
    const std::string value = AttachmentNamed(std::string(254, 'a') + "\xe2\x82\xac");
    EXPECT_EQ(value, "attachment; filename=\"" + std::string(254, 'a') + "_\"");
}

// ---- MIME types ----

constexpr const char* kTable =
    "# comment with png\n"
    "\n"
    "text/plain\t\t\ttxt asc\r\n"
    "image/png png # apng\n"
    "application/gzip                         gz\n"
    "broken png2\n"
    "/x png2\n"
    "x/ png2\n"
    "text/second txt\n"
    "evil/\x01type ctl\n"
    "image/jpeg jpeg jpg";

TEST(MimeTypes, AreFoundInTheTable) {
    const std::pair<const char*, const char*> rows[] = {
        {"png", "image/png"},
        {"PNG", "image/png"},
        {"asc", "text/plain"},
        {"txt", "text/plain"},
        {"gz", "application/gzip"},
        {"jpg", "image/jpeg"},
        {"jpeg", "image/jpeg"},
        {"", ""},
        {"pn", ""},
        {"pngx", ""},
        {"apng", ""},
        {"png2", ""},
        {"comment", ""},
        {"image/png", ""},
        {"ctl", ""},
    };
    for (const auto& [extension, type] : rows) {
        EXPECT_EQ(reference::FindMimeType(kTable, extension), type) << extension;
    }
    EXPECT_EQ(reference::FindMimeType("", "png"), "");
}

class MimeTypesOfDevice : public DeviceTest {};

TEST_F(MimeTypesOfDevice, AreThoseOfItsTableByTheLastExtension) {
    WriteFile(InRoot("/etc/mime.types"), kTable);
    const std::pair<std::string, const char*> rows[] = {
        {"a.png", "image/png"},
        {"/x.y/a.tar.GZ", "application/gzip"},
        {"/a.png/b", "application/octet-stream"},
        {".png", "application/octet-stream"},
        {"/d/.png", "application/octet-stream"},
        {"a.", "application/octet-stream"},
        {"", "application/octet-stream"},
        {"a.unknown", "application/octet-stream"},
        {std::string("a.png\0.txt", 10), "text/plain"},
        {"a.png\r\n", "application/octet-stream"},
        {"a." + std::string(100'000, 'x'), "application/octet-stream"},
    };
    for (const auto& [name, type] : rows) {
        EXPECT_EQ(HTTPFileOutputer::GetMimeType(name), type) << name.substr(0, 50);
    }
}

TEST_F(MimeTypesOfDevice, WithoutATableNoNameTellsOne) {
    unlink(InRoot("/etc/mime.types").c_str());
    EXPECT_EQ(HTTPFileOutputer::GetMimeType("a.png"), "application/octet-stream");
}

}  // namespace
