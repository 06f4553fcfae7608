#include "taskmanager/TaskWait.h"

#include <poll.h>
#include <sys/inotify.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <ctime>

#include "taskmanager/TaskProcess.h"

namespace reference {

namespace {

/** How often to look where the kernel gives no descriptor that tells. */
constexpr long kPollMilliseconds = 50;

long MonotonicMilliseconds() {
    struct timespec now;
    clock_gettime(CLOCK_MONOTONIC, &now);
    return now.tv_sec * 1000 + now.tv_nsec / 1000000;
}

/**
 * The process's own queue of file events, made at the first wait and never closed: the kernel takes some 15
 * milliseconds to close one, which would be added to each answer that waits for a task. -1 if there can be none.
 */
int FileEvents() {
    static int descriptor = -1;
    static pid_t maker = 0;
    if (maker != getpid()) {
        // A queue that came with a fork would share its events with the parent's.
        const UniqueFd inherited(maker != 0 ? descriptor : -1);
        maker = getpid();
        descriptor = inotify_init1(IN_CLOEXEC | IN_NONBLOCK);
    }
    return descriptor;
}

/** Tells when the file of a record is replaced or removed. */
class RecordWatch {
public:
    RecordWatch() : notify(FileEvents()) {}
    RecordWatch(const RecordWatch&) = delete;
    RecordWatch& operator=(const RecordWatch&) = delete;
    ~RecordWatch() {
        if (watch >= 0) {
            inotify_rm_watch(notify, watch);
        }
        Drain();
    }

    /** Watches the file that bears the record's name now. What happens to it from here on is not missed. */
    void Renew(const TaskKey& key) {
        // The folder itself cannot be watched by who may not list it. A file that is replaced loses its last name, and
        // its watch with it.
        constexpr unsigned int kEvents = IN_ATTRIB | IN_DELETE_SELF | IN_MOVE_SELF | IN_DONT_FOLLOW;
        watch = notify >= 0 ? inotify_add_watch(notify, TaskStore::PathOf(key).c_str(), kEvents) : -1;
    }

    void Drain() const {
        char events[4096];
        while (notify >= 0 && read(notify, events, sizeof(events)) > 0) {
        }
    }

    int Descriptor() const { return watch >= 0 ? notify : -1; }

private:
    int notify;
    int watch = -1;
};

/** Tells when the process of a record ends. */
class ProcessWatch {
public:
    /** False if the record names a process that does not run any more. */
    bool Renew(const TaskRecord& record) {
        if (record.pid != pid) {
            pid = record.pid;
            process.Reset(OpenProcess(pid));
        }
        return pid == 0 || IsProcessRunning(pid, record.processStart);
    }

    bool IsNeeded() const { return pid != 0; }
    int Descriptor() const { return process.Get(); }

private:
    int pid = 0;
    UniqueFd process;
};

}  // namespace

bool WaitForTaskProperty(const TaskKey& key, const std::string& name, int seconds) {
    const long deadline = MonotonicMilliseconds() + std::max(seconds, 0) * 1000L;
    TaskStore::Entry entry;
    RecordWatch watch;
    ProcessWatch process;
    bool ended = false;
    for (;;) {
        watch.Renew(key);
        if (TaskStore::Load(key, entry) != TaskStore::Result::kGood) {
            return false;
        }
        if (entry.record.properties.isMember(name)) {
            return true;
        }
        if (ended && !entry.record.finished) {
            return false;
        }
        const long left = deadline - MonotonicMilliseconds();
        if (left <= 0) {
            return false;
        }
        // A process that ended may have written before: one more look tells.
        ended = !entry.record.finished && !process.Renew(entry.record);
        if (ended) {
            continue;
        }
        const bool watchesProcess = process.IsNeeded() && !entry.record.finished;
        struct pollfd events[2] = {{watch.Descriptor(), POLLIN, 0},
                                   {watchesProcess ? process.Descriptor() : -1, POLLIN, 0}};
        const bool blind = events[0].fd < 0 || (watchesProcess && events[1].fd < 0);
        poll(events, 2, static_cast<int>(blind ? std::min(left, kPollMilliseconds) : left));
        watch.Drain();
    }
}

}  // namespace reference
