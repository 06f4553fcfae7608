#pragma once

#include <sys/types.h>

#include <chrono>
#include <map>

#include "ListeningSocket.h"
#include "Waiting.h"

namespace host {

struct PoolLimits {
    /** Children that wait for a connection. */
    unsigned idle = 4;
    /** Children at once, waiting and serving. Further connections wait in the socket's queue. */
    unsigned most = 64;
    /** How long one may serve. */
    std::chrono::seconds call{600};
    /** How long those that serve may go on after the service was told to end. */
    std::chrono::seconds grace{30};
};

/**
 * A parent that never serves, and children that each serve one connection and end.
 *
 * The parent keeps children waiting and forks a new one when one has got a connection, beside the serving. It holds no
 * connection, no API library, and takes no processor time while nothing happens. A child that crashes costs its own
 * connection; children that end without one make the parent wait ever longer before the next (up to half a minute). A
 * child above its time is killed together with the process group that it leads. Every ended child is waited for.
 *
 * One per process, which must have a single thread.
 */
class Pool {
public:
    Pool(ListeningSocket& socket, const PoolLimits& limits, Serve serve);
    Pool(const Pool&) = delete;
    Pool& operator=(const Pool&) = delete;
    ~Pool();

    /**
     * Serves until SIGTERM or SIGINT. Then the socket is stopped, waiting children end at once, and those that serve
     * when they are done or the grace is over. Logs children that crash or are killed.
     * @return false, logged, if it could not start.
     */
    bool Run();

private:
    using Clock = std::chrono::steady_clock;

    struct Child {
        bool serves = false;
        /** Of one that serves. */
        Clock::time_point limit{};
        bool killed = false;
    };

    void Refill();
    void Fork();
    void PutOff();
    void TakeReports();
    void Reap();
    void Forget(pid_t child, int status);
    void KillOverdue();
    void BeginStop();
    void Wait();

    unsigned CountIdle() const;
    bool WantsMore() const;
    Clock::time_point NextEvent() const;

    ListeningSocket& socket;
    PoolLimits limits;
    Serve serve;
    std::map<pid_t, Child> children;
    Descriptor reports;
    Descriptor reporting;
    Descriptor retired;
    Descriptor retiring;
    bool stopping = false;
    bool full = false;
    Clock::time_point graceEnd{};
    Clock::time_point nextFork{};
    std::chrono::milliseconds pause{0};
};

}  // namespace host
