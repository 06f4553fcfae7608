#include <sys/stat.h>

#include <cstdio>
#include <sstream>

#include "PrivateDevice.h"
#include "Seam.h"
#include "common/LazyModule.h"

namespace {

using WebServer = DeviceTest;

bool Restart(const std::string& file) {
    WriteFile(InRoot("/etc/zova/web-server.json"), file);
    return zovaw3::ZELM(zovaw3::Engine::CreatePrivate()).RestartService();
}

std::string LinkProbeLine(const std::string& title) {
    FILE* pipe = popen(ZOVA_LINK_PROBE, "r");
    std::string output;
    char part[4096];
    for (size_t got; pipe != nullptr && (got = fread(part, 1, sizeof(part), pipe)) > 0;) {
        output.append(part, got);
    }
    EXPECT_TRUE(pipe != nullptr && pclose(pipe) == 0);
    std::istringstream lines(output);
    for (std::string line; std::getline(lines, line);) {
        if (line.compare(0, title.size(), title) == 0) {
            return line;
        }
    }
    ADD_FAILURE() << output;
    return "";
}

int PortOf(const std::string& file) {
    WriteFile(InRoot("/etc/zova/web-server.json"), file);
    return zovaw3::ZELM(zovaw3::Engine::CreatePrivate()).GetHttpsPort();
}

size_t Count(const std::string& text, const std::string& part) {
    size_t count = 0;
    for (size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) {
        ++count;
    }
    return count;
}

}  // namespace

TEST(LinkedProgram, MapsOneObjectForAllNamesAndNoCipherOrLoginLibrary) {
    const std::string mapped = LinkProbeLine("start");
    EXPECT_EQ(Count(mapped, "libzova") + Count(mapped, "libwebapi"), 1u) << mapped;
    for (const char* library : {"libcrypto", "libssl", "libpam", "libcurl", "libsqlite", "zova-crypto", "zova-login",
                                "zova-sqlite", "zova-https"}) {
        EXPECT_EQ(Count(mapped, library), 0u) << library;
    }
}

TEST(LinkedProgram, FindsTheCipherModuleBesideTheLibraryAtFirstUse) {
    const std::string mapped = LinkProbeLine("cipher");
    EXPECT_EQ(Count(mapped, "zova-crypto.so"), 1u) << mapped;
    EXPECT_EQ(Count(mapped, "libcrypto"), 1u) << mapped;
    EXPECT_EQ(Count(mapped, "libpam"), 0u) << mapped;
}

TEST(LazyModule, HasNoSymbolsIfItCannotBeOpened) {
    reference::LazyModule missing("no-such-module.so");
    EXPECT_EQ(missing.Find<int()>("anything"), nullptr);
    EXPECT_EQ(missing.Find<int()>("anything"), nullptr);
    reference::LazyModule outside("../../no-such-module.so");
    EXPECT_EQ(outside.Find<int()>("anything"), nullptr);
    reference::LazyModule crypto("zova-crypto.so");
    EXPECT_EQ(crypto.Find<int()>("anything"), nullptr);
    EXPECT_NE(crypto.Find<int()>("ZovaCryptoOpenSealed"), nullptr);
}

TEST_F(WebServer, RunsTheCommandWithItsArgumentsAndNoShell) {
    const std::string target = InRoot("/scratch/$(touch x);made");
    EXPECT_TRUE(Restart("{\"restart\":[\"/usr/bin/touch\",\"" + target + "\"]}"));
    EXPECT_TRUE(Exists(target));
}

TEST_F(WebServer, FailsWhereTheCommandFails) {
    EXPECT_FALSE(Restart(R"({"restart":["/bin/false"]})"));
    EXPECT_FALSE(Restart(R"({"restart":["/no/such/program"]})"));
}

TEST_F(WebServer, FailsWithoutAUsableCommand) {
    EXPECT_FALSE(zovaw3::ZELM(zovaw3::Engine::CreatePrivate()).RestartService());
    EXPECT_FALSE(zovaw3::ZELM(nullptr).RestartService());
    for (const char* file :
         {"", "[]", "{}", "null", R"({"restart":[]})", R"({"restart":"/bin/true"})", R"({"restart":["true"]})",
          R"({"restart":[1]})", R"({"restart":["/bin/true",null]})", R"({"restart":["/bin/true","a\u0000b"]})"}) {
        EXPECT_FALSE(Restart(file)) << file;
    }
}

TEST_F(WebServer, IgnoresAFileThatOthersCanWrite) {
    ASSERT_TRUE(Restart(R"({"restart":["/bin/true"]})"));
    ASSERT_EQ(chmod(InRoot("/etc/zova/web-server.json").c_str(), 0622), 0);
    EXPECT_FALSE(zovaw3::ZELM(zovaw3::Engine::CreatePrivate()).RestartService());
}

TEST_F(WebServer, TellsTheConfiguredHttpsPort) {
    EXPECT_EQ(PortOf(R"({"https_port":1})"), 1);
    EXPECT_EQ(PortOf(R"({"https_port":5001,"restart":["/bin/true"]})"), 5001);
    EXPECT_EQ(PortOf(R"({"https_port":65535})"), 65535);
}

TEST_F(WebServer, IsAt443WithoutAUsablePort) {
    EXPECT_EQ(zovaw3::ZELM(zovaw3::Engine::CreatePrivate()).GetHttpsPort(), 443);
    EXPECT_EQ(zovaw3::ZELM(nullptr).GetHttpsPort(), 443);
    for (const char* file :
         {"", "[]", "{}", "null", "5001", R"({"https_port":0})", R"({"https_port":-1})", R"({"https_port":65536})",
          R"({"https_port":4295032296})", R"({"https_port":18446744073709551615})", R"({"https_port":5001.5})",
          R"({"https_port":"5001"})", R"({"https_port":true})", R"({"https_port":null})", R"({"https_port":[5001]})"}) {
        EXPECT_EQ(PortOf(file), 443) << file;
    }
    ASSERT_EQ(PortOf(R"({"https_port":5001})"), 5001);
    ASSERT_EQ(chmod(InRoot("/etc/zova/web-server.json").c_str(), 0622), 0);
    EXPECT_EQ(zovaw3::ZELM(zovaw3::Engine::CreatePrivate()).GetHttpsPort(), 443);
}
