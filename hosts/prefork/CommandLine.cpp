#include "CommandLine.h"

#include <getopt.h>

#include <charconv>
#include <cstring>
#include <vector>

namespace host {
namespace {

constexpr const char* kUsual =
    "  --children N      children that wait for a connection, 1 to 256 (default 4)\n"
    "  --max N           children at once, waiting or serving, 1 to 1024, not below --children (default 64)\n"
    "  --time-limit S    seconds that one call may take, 1 to 86400 (default 600)\n"
    "  --grace S         seconds that running calls get when the service is told to end, 0 to 86400 (default 30)\n"
    "  --help            this text\n"
    "\n"
    "SIGTERM and SIGINT end the service: running calls finish first. A socket handed over by a service manager\n"
    "(LISTEN_FDS) takes the place of --socket. Ends with 1 if it cannot start and with 2 for bad arguments.\n";

enum Option : int { kSocket = 256, kGroup, kChildren, kMost, kTimeLimit, kGrace, kHelp };

std::string HelpText(const Program& program) {
    std::string text = std::string("Usage: ") + program.name + " [OPTION...]\n\n" + program.purpose + "\n";
    text += "  --socket PATH     where it listens";
    text += *program.defaultSocket == '\0' ? "\n" : std::string(" (default ") + program.defaultSocket + ")\n";
    if (program.hasGroup) {
        text += "  --group NAME      members of this group may connect too; without it root alone\n";
    }
    return text + kUsual;
}

std::vector<option> KnownOptions(const Program& program) {
    std::vector<option> known = {
        {"socket", required_argument, nullptr, kSocket}, {"children", required_argument, nullptr, kChildren},
        {"max", required_argument, nullptr, kMost},      {"time-limit", required_argument, nullptr, kTimeLimit},
        {"grace", required_argument, nullptr, kGrace},   {"help", no_argument, nullptr, kHelp}};
    if (program.hasGroup) {
        known.push_back({"group", required_argument, nullptr, kGroup});
    }
    known.push_back({nullptr, 0, nullptr, 0});
    return known;
}

/** A whole decimal number between the two, without sign. */
bool ReadNumber(const char* text, unsigned least, unsigned most, unsigned& number) {
    unsigned value = 0;
    const char* end = text + strlen(text);
    const auto [stopped, error] = std::from_chars(text, end, value);
    if (error != std::errc() || stopped != end || value < least || value > most) {
        return false;
    }
    number = value;
    return true;
}

bool ReadText(const char* text, std::string& out) {
    out = text;
    return !out.empty();
}

bool ReadSeconds(const char* text, unsigned least, std::chrono::seconds& out) {
    unsigned number = 0;
    if (!ReadNumber(text, least, 86400, number)) {
        return false;
    }
    out = std::chrono::seconds(number);
    return true;
}

bool TakeOption(int name, const char* value, CommandLine& out) {
    switch (name) {
        case kSocket:
            return ReadText(value, out.socket);
        case kGroup:
            return ReadText(value, out.group);
        case kChildren:
            return ReadNumber(value, 1, 256, out.limits.idle);
        case kMost:
            return ReadNumber(value, 1, 1024, out.limits.most);
        case kTimeLimit:
            return ReadSeconds(value, 1, out.limits.call);
        default:
            return ReadSeconds(value, 0, out.limits.grace);
    }
}

}  // namespace

CommandLineResult ParseCommandLine(const Program& program, int argc, char** argv, CommandLine& out, std::string& text) {
    const std::vector<option> known = KnownOptions(program);
    out = CommandLine();
    out.socket = program.defaultSocket;
    opterr = 0;
    // Begins anew, also where something else has been parsed before.
    optind = 0;
    int place = 0;
    for (int name; (name = getopt_long(argc, argv, "+:", known.data(), &place)) != -1;) {
        if (name == kHelp) {
            text = HelpText(program);
            return CommandLineResult::kHelp;
        }
        if (name == '?' || name == ':') {
            text = std::string(argv[optind - 1]) + (name == '?' ? " is not known; see --help" : " needs a value");
            return CommandLineResult::kBad;
        }
        if (!TakeOption(name, optarg, out)) {
            text = std::string("\"") + optarg + "\" is no value for --" + known[place].name + "; see --help";
            return CommandLineResult::kBad;
        }
    }
    if (optind < argc) {
        text = std::string(argv[optind]) + " is not known; see --help";
        return CommandLineResult::kBad;
    }
    if (out.limits.most < out.limits.idle) {
        text = "--max is below --children";
        return CommandLineResult::kBad;
    }
    return CommandLineResult::kRun;
}

}  // namespace host
