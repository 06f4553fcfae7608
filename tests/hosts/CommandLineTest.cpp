#include "prefork/CommandLine.h"

#include <gtest/gtest.h>

#include <vector>

namespace {

using host::CommandLine;
using host::CommandLineResult;

constexpr host::Program kPlain{"plaind", "Does it.\n", "", false};
constexpr host::Program kGrouped{"groupd", "Does it.\n", "/run/groupd.sock", true};

struct Parsed {
    CommandLineResult result = CommandLineResult::kBad;
    CommandLine line;
    std::string text;
};

Parsed Parse(const host::Program& program, std::vector<std::string> arguments) {
    arguments.insert(arguments.begin(), program.name);
    std::vector<char*> pointers;
    for (std::string& argument : arguments) {
        pointers.push_back(argument.data());
    }
    pointers.push_back(nullptr);
    Parsed parsed;
    parsed.result =
        ParseCommandLine(program, static_cast<int>(arguments.size()), pointers.data(), parsed.line, parsed.text);
    return parsed;
}

TEST(CommandLine, WithoutArgumentsEverythingIsAtItsDefault) {
    const Parsed parsed = Parse(kGrouped, {});
    EXPECT_EQ(parsed.result, CommandLineResult::kRun);
    EXPECT_EQ(parsed.line.socket, "/run/groupd.sock");
    EXPECT_EQ(parsed.line.group, "");
    EXPECT_EQ(parsed.line.limits.idle, 4u);
    EXPECT_EQ(parsed.line.limits.most, 64u);
    EXPECT_EQ(parsed.line.limits.call.count(), 600);
    EXPECT_EQ(parsed.line.limits.grace.count(), 30);
    EXPECT_EQ(Parse(kPlain, {}).line.socket, "");
}

TEST(CommandLine, TakesEachOptionInBothForms) {
    for (const std::vector<std::string>& arguments :
         {std::vector<std::string>{"--socket", "/a", "--group", "g", "--children", "1", "--max", "1024", "--time-limit",
                                   "86400", "--grace", "0"},
          {"--socket=/a", "--group=g", "--children=1", "--max=1024", "--time-limit=86400", "--grace=0"}}) {
        const Parsed parsed = Parse(kGrouped, arguments);
        ASSERT_EQ(parsed.result, CommandLineResult::kRun) << parsed.text;
        EXPECT_EQ(parsed.line.socket, "/a");
        EXPECT_EQ(parsed.line.group, "g");
        EXPECT_EQ(parsed.line.limits.idle, 1u);
        EXPECT_EQ(parsed.line.limits.most, 1024u);
        EXPECT_EQ(parsed.line.limits.call.count(), 86400);
        EXPECT_EQ(parsed.line.limits.grace.count(), 0);
    }
}

TEST(CommandLine, HelpNamesEveryOptionThatTheProgramHas) {
    for (const host::Program& program : {kPlain, kGrouped}) {
        const Parsed parsed = Parse(program, {"--help"});
        EXPECT_EQ(parsed.result, CommandLineResult::kHelp);
        for (const char* name : {"--socket", "--children", "--max", "--time-limit", "--grace", "--help", "Does it."}) {
            EXPECT_NE(parsed.text.find(name), std::string::npos) << name;
        }
        EXPECT_EQ(parsed.text.find("--group") != std::string::npos, program.hasGroup);
    }
}

TEST(CommandLine, RefusesWhatIsNoOptionOfTheProgram) {
    const std::vector<std::string> rows[] = {{"--unknown"},    {"-x"},       {"-"},        {"word"}, {"--", "word"},
                                             {"--group", "g"}, {"--help=x"}, {"--socket"}, {""}};
    for (const std::vector<std::string>& arguments : rows) {
        const Parsed parsed = Parse(kPlain, arguments);
        EXPECT_EQ(parsed.result, CommandLineResult::kBad) << arguments[0];
        EXPECT_NE(parsed.text, "") << arguments[0];
    }
}

TEST(CommandLine, RefusesNumbersThatAreNoneOrOutOfRangeAndNamesTheOption) {
    const std::pair<const char*, std::vector<const char*>> rows[] = {
        {"--children", {"0", "257", "-1", "+1", " 1", "1 ", "1x", "0x1", "", "4294967297", "99999999999999999999"}},
        {"--max", {"0", "1025", "-1", "1.5", ""}},
        {"--time-limit", {"0", "86401", "-1", "1s", ""}},
        {"--grace", {"-1", "86401", ""}},
        {"--socket", {""}},
        {"--group", {""}}};
    for (const auto& [name, values] : rows) {
        for (const char* value : values) {
            const Parsed parsed = Parse(kGrouped, {name, value});
            EXPECT_EQ(parsed.result, CommandLineResult::kBad) << name << " " << value;
            EXPECT_NE(parsed.text.find(name), std::string::npos) << parsed.text;
        }
    }
}

TEST(CommandLine, RefusesFewerChildrenInAllThanWaitingOnes) {
    EXPECT_EQ(Parse(kPlain, {"--children", "5", "--max", "4"}).result, CommandLineResult::kBad);
    EXPECT_EQ(Parse(kPlain, {"--max", "3"}).result, CommandLineResult::kBad);
    EXPECT_EQ(Parse(kPlain, {"--children", "4", "--max", "4"}).result, CommandLineResult::kRun);
}

}  // namespace
