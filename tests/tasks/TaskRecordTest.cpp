#include "taskmanager/TaskRecord.h"

#include <gtest/gtest.h>

#include "taskmanager/TaskKey.h"

using reference::ParseTaskRecord;
using reference::TaskKey;
using reference::TaskRecord;
using reference::WriteTaskRecord;

namespace {

const TaskKey kKey{"alice", "1"};

constexpr const char* kGood =
    R"({"finished":false,"format":1,"id":"1","owner":"alice","pid":7,"process_start":9,"properties":{"a":[1]},)"
    R"("removed":false,"removed_at":0})";

std::string Replaced(const std::string& from, const std::string& to) {
    std::string text = kGood;
    const size_t at = text.find(from);
    EXPECT_NE(at, std::string::npos) << from;
    return at == std::string::npos ? text : text.replace(at, from.size(), to);
}

struct BadRow {
    const char* name;
    std::string text;
};

class BadTaskRecord : public ::testing::TestWithParam<BadRow> {};

}  // namespace

TEST(TaskRecord, IsReadAsItWasWritten) {
    TaskRecord record;
    ASSERT_TRUE(ParseTaskRecord(kGood, kKey, record));
    EXPECT_EQ(record.pid, 7);
    EXPECT_EQ(record.processStart, 9u);
    EXPECT_EQ(record.properties["a"][0].asInt(), 1);
    EXPECT_EQ(WriteTaskRecord(kKey, record), kGood);
}

TEST(TaskRecord, KeepsItsLargestNumbers) {
    TaskRecord record;
    record.pid = 2147483647;
    record.processStart = 18446744073709551615u;
    record.removedAt = 18446744073709551615u;
    record.finished = record.removed = true;
    TaskRecord read;
    ASSERT_TRUE(ParseTaskRecord(WriteTaskRecord(kKey, record), kKey, read));
    EXPECT_EQ(read.pid, record.pid);
    EXPECT_EQ(read.processStart, record.processStart);
    EXPECT_EQ(read.removedAt, record.removedAt);
    EXPECT_TRUE(read.finished && read.removed);
}

TEST_P(BadTaskRecord, IsRefusedAndLeavesTheResultAlone) {
    TaskRecord record;
    record.pid = 42;
    EXPECT_FALSE(ParseTaskRecord(GetParam().text, kKey, record));
    EXPECT_EQ(record.pid, 42);
}

INSTANTIATE_TEST_SUITE_P(
    Rows, BadTaskRecord,
    ::testing::Values(BadRow{"Empty", ""}, BadRow{"Truncated", std::string(kGood).substr(0, 60)},
                      BadRow{"Null", "null"}, BadRow{"Array", "[]"}, BadRow{"NoMembers", "{}"}, BadRow{"Text", "\"x\""},
                      BadRow{"More", std::string(kGood) + "{}"}, BadRow{"Zeros", std::string(100, '\0')},
                      BadRow{"OtherFormat", Replaced("\"format\":1", "\"format\":2")},
                      BadRow{"FormatZero", Replaced("\"format\":1", "\"format\":0")},
                      BadRow{"OtherOwner", Replaced("alice", "bob")},
                      BadRow{"OtherId", Replaced("\"id\":\"1\"", "\"id\":\"2\"")},
                      BadRow{"IdIsNumber", Replaced("\"id\":\"1\"", "\"id\":1")},
                      BadRow{"NegativePid", Replaced("\"pid\":7", "\"pid\":-1")},
                      BadRow{"HugePid", Replaced("\"pid\":7", "\"pid\":2147483648")},
                      BadRow{"PidIsText", Replaced("\"pid\":7", "\"pid\":\"7\"")},
                      BadRow{"PidIsReal", Replaced("\"pid\":7", "\"pid\":7.0")},
                      BadRow{"PidIsMissing", Replaced("\"pid\":7,", "")},
                      BadRow{"HugeStart", Replaced("\"process_start\":9", "\"process_start\":18446744073709551616")},
                      BadRow{"FinishedIsNumber", Replaced("\"finished\":false", "\"finished\":0")},
                      BadRow{"RemovedIsNull", Replaced("\"removed\":false", "\"removed\":null")},
                      BadRow{"PropertiesAreNull", Replaced("{\"a\":[1]}", "null")},
                      BadRow{"PropertiesAreArray", Replaced("{\"a\":[1]}", "[1]")},
                      BadRow{"MemberTooMany", Replaced("\"format\":1", "\"format\":1,\"x\":1")},
                      BadRow{"TooDeep", Replaced("[1]", std::string(300, '[') + std::string(300, ']'))},
                      BadRow{"TooLong", std::string(reference::kLargestTaskRecord + 1, ' ')}),
    [](const auto& row) { return std::string(row.param.name); });

TEST(TaskRecord, ExpiresAMinuteAfterItsRemovalWasSettled) {
    TaskRecord record;
    record.finished = record.removed = true;
    record.removedAt = 100;
    EXPECT_FALSE(record.IsExpired(100));
    EXPECT_FALSE(record.IsExpired(159));
    EXPECT_TRUE(record.IsExpired(160));
    EXPECT_TRUE(record.IsExpired(99)) << "a time to come is of an earlier boot";
    record.removed = false;
    EXPECT_FALSE(record.IsExpired(100000));
}
