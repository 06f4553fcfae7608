// Names of hosts and domains, addresses, and small letters.

#include <gtest/gtest.h>
#include <sys/socket.h>

#include <string>

#include "Seam.h"

namespace {

std::string Labels(int count, std::size_t length) {
    std::string name;
    for (int label = 0; label < count; ++label) {
        name += (name.empty() ? "" : ".") + std::string(length, 'a');
    }
    return name;
}

std::string Lowered(std::string text, std::size_t size) {
    QLIBCStrCaseLower(text.data(), 0, 0, size);
    return text;
}

}  // namespace

TEST(HostNames, AreLabelsOfLettersDigitsAndHyphens) {
    for (const char* name : {"a", "disk", "DISK-1", "1disk", "disk.local", "a.b.c.d", "xn--bcher-kva.example", "1.a",
                             "3com.com", "a--b", "0xyz", "disk.0x1g", "0x1.a"}) {
        EXPECT_EQ(BlQLIBIsHostname(name), 1) << name;
    }
}

TEST(HostNames, AreRefusedForEverythingElse) {
    for (const char* name : {"",    ".",   "..",   ".a",  "a.",  "a..b", "-a",   "a-",   "a.-b",     "a-.b",
                             "a_b", "_a",  "a b",  " a",  "a ",  "a\n",  "a/b",  "a:80", "[::1]",    "::1",
                             "a@b", "a;b", "$(a)", "`a`", "a\"", "a'b",  "a\\b", "*.a",  "\xc3\xa4", "a\x7f"}) {
        EXPECT_EQ(BlQLIBIsHostname(name), 0) << name;
        EXPECT_EQ(BlQLIBIsDomain(name), 0) << name;
    }
    EXPECT_EQ(BlQLIBIsHostname(nullptr), 0);
    EXPECT_EQ(BlQLIBIsDomain(nullptr), 0);
}

TEST(HostNames, AreNoNumbersThatAResolverTakesForAnAddress) {
    for (const char* name : {"127.0.0.1", "127.1", "1", "2130706433", "0x7f000001", "0X7F.1", "a.1", "a.0x1", "0x"}) {
        EXPECT_EQ(BlQLIBIsHostname(name), 0) << name;
        EXPECT_EQ(BlQLIBIsDomain(name), 0) << name;
    }
}

TEST(HostNames, HaveLabelsOf63AndAWholeOf253Characters) {
    EXPECT_EQ(BlQLIBIsHostname(Labels(1, 63).c_str()), 1);
    EXPECT_EQ(BlQLIBIsHostname(Labels(1, 64).c_str()), 0);
    EXPECT_EQ(BlQLIBIsHostname((Labels(3, 63) + "." + Labels(1, 61)).c_str()), 1);
    EXPECT_EQ(BlQLIBIsHostname((Labels(3, 63) + "." + Labels(1, 62)).c_str()), 0);
    EXPECT_EQ(BlQLIBIsHostname(std::string(1000000, 'a').c_str()), 0);
    EXPECT_EQ(BlQLIBIsHostname(std::string(1000000, '.').c_str()), 0);
}

TEST(Domains, AreHostNamesOfTwoLabelsOrMore) {
    for (const char* name : {"example.com", "a.b", "mail.example.com", "EXAMPLE.local"}) {
        EXPECT_EQ(BlQLIBIsDomain(name), 1) << name;
    }
    for (const char* name : {"example", "localhost", "a-b"}) {
        EXPECT_EQ(BlQLIBIsDomain(name), 0) << name;
        EXPECT_EQ(BlQLIBIsHostname(name), 1) << name;
    }
}

TEST(AddressTypes, AreToldByTheText) {
    for (const char* text : {"192.0.2.1", "0.0.0.0", "255.255.255.255"}) {
        EXPECT_EQ(ZOVANetGetAddrType(text), AF_INET) << text;
    }
    for (const char* text : {"::", "::1", "2001:DB8::1", "::ffff:192.0.2.1", "1:2:3:4:5:6:7:8"}) {
        EXPECT_EQ(ZOVANetGetAddrType(text), AF_INET6) << text;
    }
}

TEST(AddressTypes, AreNoneForEverythingElse) {
    for (const char* text : {"",
                             " ",
                             "disk",
                             "192.0.2",
                             "192.0.2.256",
                             "192.0.2.1.",
                             "192.0.2.1 ",
                             " 192.0.2.1",
                             "192.0.2.1\n",
                             "192.0.2.1:80",
                             "192.0.2.0/24",
                             "192.0.2.01",
                             "0x7f.0.0.1",
                             "2130706433",
                             ":",
                             ":::",
                             "1::2::3",
                             "::12345",
                             "[::1]",
                             "::1%lo",
                             "fe80::1%eth0",
                             "::1/64",
                             "1:2:3:4:5:6:7:8:9",
                             "g::1"}) {
        EXPECT_EQ(ZOVANetGetAddrType(text), 0) << text;
    }
    EXPECT_EQ(ZOVANetGetAddrType(nullptr), 0);
    EXPECT_EQ(ZOVANetGetAddrType(std::string(1000000, '1').c_str()), 0);
}

TEST(SmallLetters, ReplaceTheCapitalsOfASCIIOnly) {
    EXPECT_EQ(Lowered("AZaz09@[`{ \xc4\xe4", 14), "azaz09@[`{ \xc4\xe4");
    QLIBCStrCaseLower(nullptr, 0, 0, 5);
}

TEST(SmallLetters, EndAtTheSizeAndAtTheZeroByte) {
    EXPECT_EQ(Lowered("ABCD", 2), "abCD");
    EXPECT_EQ(Lowered("ABCD", 0), "ABCD");
    EXPECT_EQ(Lowered(std::string("AB\0CD", 5), 6), std::string("ab\0CD", 5));
}
