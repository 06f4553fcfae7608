#include "zovacgi/PublishedFiles.h"

#include <sys/stat.h>
#include <sys/types.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <utility>

namespace reference {

namespace {

struct Node {
    UniqueFd descriptor;
    std::string path;
    pid_t process;
    Node* next;
};

/** A list that only grows, so that a signal handler can walk it at any moment. */
std::atomic<Node*> published;

void RemovePublished() {
    const pid_t process = getpid();
    for (const Node* node = published; node != nullptr; node = node->next) {
        struct stat held;
        struct stat named;
        if (node->process == process && fstat(node->descriptor.Get(), &held) == 0 &&
            lstat(node->path.c_str(), &named) == 0 && held.st_dev == named.st_dev && held.st_ino == named.st_ino) {
            unlink(node->path.c_str());
        }
    }
}

void RemoveAndEnd(int number) {
    const int error = errno;
    RemovePublished();
    signal(number, SIG_DFL);
    raise(number);
    errno = error;
}

struct RemovalAtExit {
    RemovalAtExit() {
        for (const int number : {SIGTERM, SIGINT, SIGHUP}) {
            struct sigaction before;
            if (sigaction(number, nullptr, &before) == 0 && before.sa_handler == SIG_DFL) {
                struct sigaction action {};
                action.sa_handler = RemoveAndEnd;
                sigaction(number, &action, nullptr);
            }
        }
    }
    ~RemovalAtExit() { RemovePublished(); }
};

}  // namespace

void KeepPublished(UniqueFd descriptor, const std::string& path) {
    static const RemovalAtExit removal;
    published = new Node{std::move(descriptor), path, getpid(), published};
}

}  // namespace reference
