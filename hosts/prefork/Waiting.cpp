#include "Waiting.h"

#include <pthread.h>
#include <signal.h>
#include <sys/epoll.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <exception>

namespace host {
namespace {

int servedConnection = -1;

void CloseServedConnection() {
    if (servedConnection >= 0) {
        close(servedConnection);
        servedConnection = -1;
    }
}

bool Watch(int set, int descriptor, unsigned events) {
    epoll_event event{};
    event.events = events;
    event.data.fd = descriptor;
    return epoll_ctl(set, EPOLL_CTL_ADD, descriptor, &event) == 0;
}

/** Whether a connection seems to be there; false if the child is not wanted any more. */
bool WaitForConnection(int set, int retired) {
    epoll_event events[2];
    int count;
    while ((count = epoll_wait(set, events, 2, -1)) < 0 && errno == EINTR) {
    }
    for (int i = 0; i < count; ++i) {
        if (events[i].data.fd == retired) {
            return false;
        }
    }
    return count > 0;
}

/** The connection; none if the child is to end without one. */
Descriptor TakeConnection(const WaitingPlace& place) {
    // Of those who wait one is woken, and not all.
    const Descriptor set(epoll_create1(EPOLL_CLOEXEC));
    if (!set.IsOpen() || !Watch(set.Get(), place.retired.Get(), EPOLLIN) ||
        !Watch(set.Get(), place.socket.Get(), EPOLLIN | EPOLLEXCLUSIVE)) {
        return Descriptor();
    }
    while (WaitForConnection(set.Get(), place.retired.Get())) {
        Descriptor connection(accept4(place.socket.Get(), nullptr, nullptr, SOCK_CLOEXEC));
        if (connection.IsOpen() || (errno != EAGAIN && errno != ECONNABORTED && errno != EINTR)) {
            return connection;
        }
    }
    return Descriptor();
}

void BecomeIndependent(pid_t parent) {
    setsid();
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (getppid() != parent) {
        _exit(1);
    }
    for (int number : {SIGCHLD, SIGTERM, SIGINT}) {
        signal(number, SIG_DFL);
    }
    sigset_t none;
    sigemptyset(&none);
    sigprocmask(SIG_SETMASK, &none, nullptr);
}

int ServeFenced(const Serve& serve, int connection) {
    try {
        serve(connection);
        return 0;
    } catch (const std::exception& exception) {
        syslog(LOG_ERR, "a connection was dropped by an exception: %s", exception.what());
    } catch (...) {
        syslog(LOG_ERR, "a connection was dropped by an exception");
    }
    return 1;
}

}  // namespace

bool KeepConnectionFromForks() {
    return pthread_atfork(nullptr, nullptr, CloseServedConnection) == 0;
}

void WaitAndServe(const WaitingPlace& place, const Serve& serve) {
    BecomeIndependent(place.parent);
    place.socket.LeaveLockToParent();
    Descriptor connection = TakeConnection(place);
    if (!connection.IsOpen()) {
        _exit(0);
    }
    const pid_t self = getpid();
    if (write(place.reporting.Get(), &self, sizeof(self)) != sizeof(self)) {
        _exit(1);
    }
    place.socket.CloseInChild();
    place.retired.Close();
    place.reporting.Close();
    servedConnection = connection.Release();
    _exit(ServeFenced(serve, servedConnection));
}

}  // namespace host
