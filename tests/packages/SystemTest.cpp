#include <gtest/gtest.h>
#include <unistd.h>

#include "../../packages/ZOVA.Core.System/Figures.h"
#include "../../packages/ZOVA.Core.System/Info.h"
#include "../../packages/ZOVA.Core.System/SystemFile.h"
#include "Call.h"

namespace {

TEST(Figures, ReadMemoryInBytes) {
    package::Memory memory;
    ASSERT_TRUE(
        package::ParseMemory("MemTotal:  16000 kB\nMemFree: 10 kB\nMemAvailable:\t 20 kB\nBuffers: 1 kB\n", memory));
    EXPECT_EQ(memory.total, 16000U * 1024);
    EXPECT_EQ(memory.free, 10U * 1024);
    EXPECT_EQ(memory.available, 20U * 1024);
}

TEST(Figures, RefuseAMemoryTextThatLacksAFigure) {
    package::Memory memory;
    memory.total = 7;
    for (const char* text :
         {"", "MemTotal: 1 kB\nMemFree: 1 kB\n", "MemTotal: x kB\nMemFree: 1 kB\nMemAvailable: 1 kB\n",
          "MemTotal: 18446744073709551615 kB\nMemFree: 1 kB\nMemAvailable: 1 kB\n"}) {
        EXPECT_FALSE(package::ParseMemory(text, memory)) << text;
        EXPECT_EQ(memory.total, 7U) << text;
    }
}

TEST(SystemFile, RefusesWhatCannotBeRead) {
    std::string text = "before";
    EXPECT_FALSE(package::ReadSystemFile("/no/such/file", text));
    EXPECT_FALSE(package::ReadSystemFile("/proc", text));
    EXPECT_FALSE(package::ReadSystemFile("/dev/zero", text));
    EXPECT_EQ(text, "before");
}

TEST(System, InfoTellsTheFiguresOfThisMachine) {
    char name[256] = {};
    ASSERT_EQ(gethostname(name, sizeof(name) - 1), 0);
    const Call call(package::Info, Json::Value());
    ASSERT_EQ(call.Error(), 0);
    const Json::Value data = call.Data();
    EXPECT_EQ(data["hostname"], name);
    EXPECT_GT(data["uptime"].asUInt64(), 0U);
    EXPECT_TRUE(data["load"]["1"].isDouble());
    EXPECT_TRUE(data["load"]["15"].isDouble());
    EXPECT_EQ(data["memory"]["total"].asUInt64() / (1 << 20),
              static_cast<std::uint64_t>(sysconf(_SC_PHYS_PAGES)) * sysconf(_SC_PAGESIZE) / (1 << 20));
    EXPECT_LE(data["memory"]["free"].asUInt64(), data["memory"]["total"].asUInt64());
}

TEST(System, InfoTellsTheRealSizeOfEachVolume) {
    const Json::Value volumes = Call(package::Info, Json::Value()).Data()["volumes"];
    ASSERT_TRUE(volumes.isArray());
    ASSERT_FALSE(volumes.empty());
    for (const Json::Value& volume : volumes) {
        EXPECT_EQ(volume["mount_point"].asString().front(), '/');
        EXPECT_GT(volume["total"].asUInt64(), 0U);
        EXPECT_LE(volume["free"].asUInt64(), volume["total"].asUInt64());
        EXPECT_LE(volume["available"].asUInt64(), volume["free"].asUInt64());
    }
}

}  // namespace
