#include "Daemon.h"

#include <grp.h>
#include <syslog.h>

#include <cstdio>

#include "../common/StandardDescriptors.h"
#include "../prefork/HandedOver.h"
#include "Conversation.h"

namespace host {
namespace {

int Complain(const Program& program, const std::string& problem, int status) {
    fprintf(stderr, "%s: %s\n", program.name, problem.c_str());
    return status;
}

std::optional<ListeningSocket> OpenSocket(const std::string& path, std::optional<gid_t> group, std::string& problem) {
    Descriptor handedOver = TakeHandedOver(problem);
    if (!problem.empty()) {
        return std::nullopt;
    }
    if (handedOver.IsOpen()) {
        return ListeningSocket::Adopt(std::move(handedOver), problem);
    }
    if (path.empty()) {
        problem = "--socket is missing";
        return std::nullopt;
    }
    SocketPlace place;
    place.path = path;
    if (group) {
        place.group = *group;
        place.mode = 0660;
    }
    return ListeningSocket::Bind(place, problem);
}

}  // namespace

int RunDaemon(const Program& program, int argc, char** argv, const Answer& answer) {
    if (!OpenStandardDescriptors()) {
        return 1;
    }
    CommandLine line;
    std::string text;
    switch (ParseCommandLine(program, argc, argv, line, text)) {
        case CommandLineResult::kHelp:
            return fputs(text.c_str(), stdout) < 0 ? 1 : 0;
        case CommandLineResult::kBad:
            return Complain(program, text, 2);
        case CommandLineResult::kRun:
            break;
    }
    std::optional<gid_t> group;
    if (!line.group.empty()) {
        const struct group* found = getgrnam(line.group.c_str());
        if (found == nullptr) {
            return Complain(program, "there is no group \"" + line.group + "\"", 1);
        }
        group = found->gr_gid;
    }
    std::optional<ListeningSocket> socket = OpenSocket(line.socket, group, text);
    if (!socket) {
        return Complain(program, text, 1);
    }
    openlog(program.name, LOG_PID, LOG_DAEMON);
    Pool pool(*socket, line.limits, [&](int connection) { Converse(connection, group, answer); });
    return pool.Run() ? 0 : 1;
}

}  // namespace host
