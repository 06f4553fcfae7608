#include "Pool.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <utility>
#include <vector>

namespace host {
namespace {

constexpr std::chrono::milliseconds kFirstPause{100};
constexpr std::chrono::milliseconds kLongestPause{30'000};

volatile sig_atomic_t stopSignal = 0;

void NoteStop(int number) {
    stopSignal = number;
}

/** Only interrupts the wait. */
void NoteChild(int) {}

/** Signals arrive during the wait and at no other time, so that none is missed between a look and the wait. */
bool TakeSignals() {
    sigset_t heard;
    sigemptyset(&heard);
    struct sigaction action {};
    sigfillset(&action.sa_mask);
    const auto hear = [&](int number, void (*handler)(int)) {
        action.sa_handler = handler;
        sigaddset(&heard, number);
        return sigaction(number, &action, nullptr) == 0;
    };
    stopSignal = 0;
    return hear(SIGCHLD, NoteChild) && hear(SIGTERM, NoteStop) && hear(SIGINT, NoteStop) &&
           sigprocmask(SIG_SETMASK, &heard, nullptr) == 0;
}

bool OpenPipe(Descriptor& reading, Descriptor& writing, int flags) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC | flags) != 0) {
        return false;
    }
    reading = Descriptor(ends[0]);
    writing = Descriptor(ends[1]);
    return true;
}

void Kill(pid_t child) {
    // Its group are those that its call has forked. It leads one unless it was forked this very moment.
    kill(-child, SIGKILL);
    kill(child, SIGKILL);
}

}  // namespace

Pool::Pool(ListeningSocket& given, const PoolLimits& givenLimits, Serve givenServe)
    : socket(given), limits(givenLimits), serve(std::move(givenServe)) {}

Pool::~Pool() = default;

bool Pool::Run() {
    if (!OpenPipe(reports, reporting, O_NONBLOCK) || !OpenPipe(retired, retiring, 0) || !KeepConnectionFromForks() ||
        !TakeSignals()) {
        syslog(LOG_ERR, "the service cannot start: %m");
        return false;
    }
    while (!stopping || !children.empty()) {
        KillOverdue();
        if (stopping) {
            Wait();
        } else if (stopSignal != 0) {
            BeginStop();
        } else {
            Refill();
            Wait();
        }
        Reap();
    }
    return true;
}

void Pool::BeginStop() {
    stopping = true;
    graceEnd = Clock::now() + limits.grace;
    socket.Stop();
    // Waiting children see the end of this pipe.
    retiring.Close();
}

// ---- new children ----

unsigned Pool::CountIdle() const {
    return static_cast<unsigned>(
        std::count_if(children.begin(), children.end(), [](const auto& entry) { return !entry.second.serves; }));
}

bool Pool::WantsMore() const {
    return !stopping && children.size() < limits.most && CountIdle() < limits.idle;
}

void Pool::Refill() {
    while (WantsMore() && Clock::now() >= nextFork) {
        Fork();
    }
    const bool isFull = children.size() >= limits.most && CountIdle() == 0;
    if (isFull && !full) {
        syslog(LOG_WARNING, "all %u children are serving; further connections wait", limits.most);
    }
    full = isFull;
}

void Pool::Fork() {
    const pid_t parent = getpid();
    const pid_t child = fork();
    if (child == 0) {
        reports.Close();
        retiring.Close();
        WaitAndServe({socket, retired, reporting, parent}, serve);
    }
    if (child < 0) {
        syslog(LOG_ERR, "no child can be started: %m");
        PutOff();
        return;
    }
    children[child] = Child();
}

void Pool::PutOff() {
    pause = std::clamp(pause * 2, kFirstPause, kLongestPause);
    nextFork = Clock::now() + pause;
}

// ---- news of children ----

void Pool::TakeReports() {
    std::array<pid_t, 256> got;
    ssize_t size;
    // Each report was written in one piece, and so is none read in two.
    while ((size = read(reports.Get(), got.data(), sizeof(got))) > 0) {
        for (std::size_t i = 0; i < static_cast<std::size_t>(size) / sizeof(pid_t); ++i) {
            const auto child = children.find(got[i]);
            if (child != children.end()) {
                child->second.serves = true;
                child->second.limit = Clock::now() + limits.call;
                pause = std::chrono::milliseconds(0);
            }
        }
    }
}

void Pool::Reap() {
    std::vector<std::pair<pid_t, int>> ended;
    int status = 0;
    pid_t child;
    while ((child = waitpid(-1, &status, WNOHANG)) > 0) {
        ended.emplace_back(child, status);
    }
    // After them, since what a child has reported before its end is there by now.
    TakeReports();
    for (const auto& [process, how] : ended) {
        Forget(process, how);
    }
}

void Pool::Forget(pid_t process, int status) {
    const auto found = children.find(process);
    if (found == children.end()) {
        return;
    }
    const Child child = found->second;
    children.erase(found);
    if (WIFSIGNALED(status) && !child.killed) {
        syslog(LOG_ERR, "child %d ended by signal %d while it %s", process, WTERMSIG(status),
               child.serves ? "served" : "waited");
    }
    if (!child.serves && !stopping) {
        PutOff();
        syslog(LOG_ERR, "child %d ended without a connection; the next starts in %lld ms", process,
               static_cast<long long>(pause.count()));
    }
}

void Pool::KillOverdue() {
    const Clock::time_point now = Clock::now();
    const bool noGrace = stopping && now >= graceEnd;
    for (auto& [process, child] : children) {
        const bool overdue = child.serves && now >= child.limit;
        if (child.killed || (!overdue && !noGrace)) {
            continue;
        }
        syslog(LOG_WARNING, "child %d is killed: it served for longer than %s", process,
               overdue ? "its time limit" : "the service can wait for");
        Kill(process);
        child.killed = true;
    }
}

// ---- waiting ----

Pool::Clock::time_point Pool::NextEvent() const {
    Clock::time_point next = Clock::time_point::max();
    for (const auto& [process, child] : children) {
        if (child.serves && !child.killed) {
            next = std::min(next, child.limit);
        }
        if (stopping && !child.killed) {
            next = std::min(next, graceEnd);
        }
    }
    return WantsMore() ? std::min(next, nextFork) : next;
}

void Pool::Wait() {
    const Clock::time_point next = NextEvent();
    timespec left{};
    if (next != Clock::time_point::max()) {
        const auto span = std::max(next - Clock::now(), Clock::duration::zero());
        left.tv_sec = std::chrono::floor<std::chrono::seconds>(span).count();
        left.tv_nsec = static_cast<long>((span - std::chrono::seconds(left.tv_sec)).count());
    }
    sigset_t none;
    sigemptyset(&none);
    pollfd news{reports.Get(), POLLIN, 0};
    ppoll(&news, 1, next == Clock::time_point::max() ? nullptr : &left, &none);
}

}  // namespace host
