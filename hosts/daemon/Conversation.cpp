#include "Conversation.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>
#include <zovadaemon.h>

#include <cerrno>

#include "../prefork/Peer.h"

namespace host {
namespace {

constexpr const char* kDescriptions = "/usr/zova/zovaman/webapi/";
/** A peer sends at once; a connection that is only held open shall not occupy a child. */
constexpr int kFirstByteMilliseconds = 10'000;

enum class FirstByte { kThere, kGone, kLate };

FirstByte WaitForFirstByte(int connection) {
    pollfd wanted{connection, POLLIN, 0};
    if (poll(&wanted, 1, kFirstByteMilliseconds) <= 0) {
        return FirstByte::kLate;
    }
    char first = 0;
    return recv(connection, &first, 1, MSG_PEEK | MSG_DONTWAIT) == 1 ? FirstByte::kThere : FirstByte::kGone;
}

/** A method finds its process here as it does under the CGI host. */
bool PrepareProcess() {
    // A peer that breaks off must not end the process before it has put everything back and cleaned up.
    signal(SIGPIPE, SIG_IGN);
    umask(077);
    // Where the description files are missing the call answers 102.
    [[maybe_unused]] const int result = chdir(kDescriptions);
    const Descriptor nothing(open("/dev/null", O_RDWR | O_CLOEXEC));
    return nothing.IsOpen() && dup2(nothing.Get(), STDIN_FILENO) == STDIN_FILENO &&
           dup2(nothing.Get(), STDOUT_FILENO) == STDOUT_FILENO;
}

}  // namespace

void Converse(int given, std::optional<gid_t> group, const Answer& answer) {
    zovadaemon::SockConnection connection(given);
    const std::string peer = DescribePeer(given);
    if (!IsAllowedPeer(given, group)) {
        syslog(LOG_WARNING, "%s is not allowed to call", peer.c_str());
        return;
    }
    switch (WaitForFirstByte(given)) {
        case FirstByte::kGone:
            return;
        case FirstByte::kLate:
            syslog(LOG_ERR, "%s sent nothing in %d s", peer.c_str(), kFirstByteMilliseconds / 1000);
            return;
        case FirstByte::kThere:
            break;
    }
    std::string message;
    if (!connection.Recv(message)) {
        syslog(LOG_ERR, "no whole message came from %s: %m", peer.c_str());
        return;
    }
    if (!PrepareProcess()) {
        syslog(LOG_ERR, "a call of %s cannot be run: %m", peer.c_str());
        return;
    }
    const std::optional<std::string> reply = answer(message);
    if (reply && !connection.Send(*reply)) {
        syslog(LOG_ERR, "the answer does not reach %s: %m", peer.c_str());
    }
}

}  // namespace host
