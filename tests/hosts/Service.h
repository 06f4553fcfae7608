#pragma once

#include <sys/types.h>

#include <set>
#include <string>

#include "Connect.h"
#include "Folder.h"
#include "prefork/Pool.h"

/** A process with a pool, which listens from the start on. Killed, with all that descends from it, at the latest with
 * this object. */
class Service {
public:
    Service(const host::PoolLimits& limits, const host::Serve& serve);
    Service(const Service&) = delete;
    Service& operator=(const Service&) = delete;
    ~Service();

    host::Descriptor Connect() const { return ConnectTo(path); }
    /** What a connection says by itself, up to its end. */
    std::string Ask() const { return Read(Connect().Get()); }
    void Signal(int number) const;
    /** "status N" or "signal N". */
    std::string WaitForEnd();

    pid_t Process() const { return parent; }
    /** Its children that have not ended; a zombie is one that has. */
    std::set<pid_t> Children() const;
    /** Ended ones that nobody has waited for. */
    std::set<pid_t> Zombies() const;
    void WaitForChildren(std::size_t count) const;

private:
    Folder folder;
    pid_t parent = -1;

public:
    const std::string path;
};

/** Waits until the condition holds; fails the test after a long time. */
void WaitUntil(const std::function<bool()>& condition, const char* what);

/** Whether the process is there and has not ended. */
bool IsAlive(pid_t process);

/** Numbers of the open descriptors of a process. */
std::set<int> DescriptorsOf(const std::string& process);
