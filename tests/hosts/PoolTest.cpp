#include "prefork/Pool.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>

#include <fstream>

#include "Service.h"

namespace {

using std::chrono::seconds;

host::PoolLimits Limits(unsigned idle, unsigned most, seconds call = seconds(600), seconds grace = seconds(600)) {
    return {idle, most, call, grace};
}

/** Says its process id, then does what the first byte from the peer names; without one it ends. */
void Obey(int connection) {
    Write(connection, std::to_string(getpid()) + "\n");
    char command = 0;
    if (read(connection, &command, 1) != 1) {
        return;
    }
    switch (command) {
        case 'a':
            Write(connection, "done");
            return;
        case 'k':
            raise(SIGKILL);
            return;
        case 't':
            throw std::runtime_error("on purpose");
        case 'f': {
            // Two that live on: one that belongs to the call, and one that has gone its own way.
            const pid_t with = fork();
            if (with == 0) {
                pause();
            }
            const pid_t away = fork();
            if (away == 0) {
                setsid();
                pause();
            }
            Write(connection, std::to_string(with) + " " + std::to_string(away) + "\n");
            char more;
            if (read(connection, &more, 1) == 1 && more == 'h') {
                pause();
            }
            return;
        }
        default:
            return;
    }
}

pid_t ServingChild(const host::Descriptor& connection) {
    return static_cast<pid_t>(std::stol(std::string("0").append(Read(connection.Get(), true))));
}

std::string StatusLine(const std::string& process, const std::string& name) {
    std::ifstream file("/proc/" + process + "/status");
    for (std::string line; std::getline(file, line);) {
        if (line.starts_with(name + ":")) {
            return line.substr(line.find_first_not_of(" \t", name.size() + 1));
        }
    }
    return "";
}

TEST(Pool, KeepsThatManyChildrenWaiting) {
    const Service service(Limits(3, 10), Obey);
    service.WaitForChildren(3);
    const host::Descriptor connection = service.Connect();
    EXPECT_GT(ServingChild(connection), 0);
    service.WaitForChildren(4);
}

TEST(Pool, ServesEachConnectionInAChildOfItsOwnThatEndsWithIt) {
    const Service service(Limits(2, 10), Obey);
    std::set<pid_t> served;
    for (int i = 0; i < 20; ++i) {
        const host::Descriptor connection = service.Connect();
        served.insert(ServingChild(connection));
        Write(connection.Get(), "a");
        EXPECT_EQ(Read(connection.Get()), "done");
    }
    EXPECT_EQ(served.size(), 20u);
    EXPECT_EQ(served.count(service.Process()), 0u) << "the parent serves nobody";
    service.WaitForChildren(2);
}

TEST(Pool, NeverHasMoreChildrenThanItsLimitAndServesTheNextWhenOneIsFree) {
    const Service service(Limits(2, 3), Obey);
    std::vector<host::Descriptor> held;
    for (int i = 0; i < 3; ++i) {
        held.push_back(service.Connect());
        EXPECT_GT(ServingChild(held.back()), 0);
    }
    const host::Descriptor waits = service.Connect();
    ASSERT_TRUE(waits.IsOpen());
    EXPECT_EQ(service.Children().size(), 3u);
    pollfd wanted{waits.Get(), POLLIN, 0};
    EXPECT_EQ(poll(&wanted, 1, 200), 0) << "nobody is there to serve it";
    EXPECT_EQ(service.Children().size(), 3u);
    held.pop_back();
    EXPECT_GT(ServingChild(waits), 0);
    held.clear();
}

TEST(Pool, ACrashCostsTheCallThatCrashedAndNoOther) {
    const Service service(Limits(1, 10), Obey);
    const host::Descriptor other = service.Connect();
    EXPECT_GT(ServingChild(other), 0);
    for (const char* how : {"k", "t", "k", "k", "k"}) {
        const host::Descriptor connection = service.Connect();
        const pid_t child = ServingChild(connection);
        EXPECT_GT(child, 0);
        Write(connection.Get(), how);
        EXPECT_EQ(Read(connection.Get()), "");
    }
    Write(other.Get(), "a");
    EXPECT_EQ(Read(other.Get()), "done");
    service.WaitForChildren(1);
}

TEST(Pool, KillsACallAboveItsTimeWithThoseThatItForkedAndClosesItsConnection) {
    const Service service(Limits(1, 10, seconds(1)), Obey);
    const host::Descriptor connection = service.Connect();
    const pid_t child = ServingChild(connection);
    Write(connection.Get(), "f");
    const std::string forked = Read(connection.Get(), true);
    const pid_t with = static_cast<pid_t>(std::stol(std::string("0").append(forked)));
    EXPECT_GT(with, 0);
    Write(connection.Get(), "h");
    EXPECT_EQ(Read(connection.Get()), "");
    WaitUntil([&] { return !IsAlive(child) && !IsAlive(with); }, "the call is gone");
    EXPECT_GT(ServingChild(service.Connect()), 0);
}

TEST(Pool, ChildrenOfACallHoldNoConnection) {
    const Service service(Limits(1, 10), Obey);
    const host::Descriptor connection = service.Connect();
    EXPECT_GT(ServingChild(connection), 0);
    Write(connection.Get(), "f");
    const std::string forked = Read(connection.Get(), true);
    const pid_t away = static_cast<pid_t>(std::stol(forked.substr(forked.find(' '))));
    Write(connection.Get(), "e");
    EXPECT_EQ(Read(connection.Get()), "") << "the end of the connection is seen";
    EXPECT_TRUE(IsAlive(away)) << "while a child of the call lives on";
    kill(away, SIGKILL);
}

TEST(Pool, OnSigtermServingChildrenFinishAndWaitingOnesEndAtOnce) {
    for (const int number : {SIGTERM, SIGINT}) {
        Service service(Limits(3, 10), Obey);
        const host::Descriptor connection = service.Connect();
        const pid_t child = ServingChild(connection);
        service.WaitForChildren(4);
        service.Signal(number);
        WaitUntil([&] { return service.Children() == std::set<pid_t>{child}; }, "only the serving child is left");
        EXPECT_FALSE(service.Connect().IsOpen());
        EXPECT_FALSE(std::filesystem::exists(service.path));
        Write(connection.Get(), "a");
        EXPECT_EQ(Read(connection.Get()), "done");
        EXPECT_EQ(service.WaitForEnd(), "status 0");
    }
}

TEST(Pool, ACallThatHasBegunWhenTheServiceIsToldToEndIsServedWhole) {
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC | O_NONBLOCK), 0);
    const host::Descriptor begun(ends[0]);
    const host::Descriptor beginning(ends[1]);
    int served = 0;
    for (int i = 0; i < 60; ++i) {
        Service service(Limits(2, 10), [&](int connection) {
            if (write(beginning.Get(), "b", 1) == 1) {
                Write(connection, "served");
            }
        });
        service.WaitForChildren(2);
        const host::Descriptor connection = service.Connect();
        service.Signal(SIGTERM);
        served += Read(connection.Get()) == "served" ? 1 : 0;
        EXPECT_EQ(service.WaitForEnd(), "status 0");
    }
    char marks[100];
    EXPECT_EQ(std::max<ssize_t>(read(begun.Get(), marks, sizeof(marks)), 0), served);
}

TEST(Pool, WhatIsStillServedWhenTheGraceIsOverIsKilled) {
    Service service(Limits(1, 10, seconds(600), seconds(1)), Obey);
    const host::Descriptor connection = service.Connect();
    const pid_t child = ServingChild(connection);
    service.Signal(SIGTERM);
    EXPECT_EQ(Read(connection.Get()), "");
    EXPECT_EQ(service.WaitForEnd(), "status 0");
    EXPECT_FALSE(IsAlive(child));
}

TEST(Pool, ChildrenDieWithAParentThatIsKilled) {
    Service service(Limits(2, 10), Obey);
    const host::Descriptor connection = service.Connect();
    EXPECT_GT(ServingChild(connection), 0);
    service.WaitForChildren(3);
    const std::set<pid_t> children = service.Children();
    service.Signal(SIGKILL);
    EXPECT_EQ(service.WaitForEnd(), "signal 9");
    EXPECT_EQ(Read(connection.Get()), "");
    for (const pid_t child : children) {
        WaitUntil([&] { return !IsAlive(child); }, "the child has ended");
    }
}

TEST(Pool, ChildrenThatEndWithoutAConnectionAreReplacedEverMoreSlowly) {
    const Service service(Limits(1, 10), Obey);
    std::set<pid_t> seen;
    const auto end = std::chrono::steady_clock::now() + seconds(1);
    while (std::chrono::steady_clock::now() < end) {
        for (const pid_t child : service.Children()) {
            seen.insert(child);
            kill(child, SIGKILL);
        }
        poll(nullptr, 0, 1);
    }
    // One at the start, then after 0.1, 0.2, 0.4 and 0.8 seconds.
    EXPECT_GE(seen.size(), 2u);
    EXPECT_LE(seen.size(), 5u);
    EXPECT_GT(ServingChild(service.Connect()), 0) << "and yet it goes on";
}

TEST(Pool, AnIdleParentSleeps) {
    const Service service(Limits(2, 10), Obey);
    service.WaitForChildren(2);
    const std::string process = std::to_string(service.Process());
    WaitUntil([&] { return StatusLine(process, "State").starts_with("S"); }, "the parent sleeps");
    const std::string before = StatusLine(process, "voluntary_ctxt_switches");
    poll(nullptr, 0, 300);
    EXPECT_EQ(StatusLine(process, "voluntary_ctxt_switches"), before) << "it has not woken up";
}

TEST(Pool, AManyTimesUsedParentHasNoMoreDescriptorsAndNoZombies) {
    const Service service(Limits(2, 10), Obey);
    service.WaitForChildren(2);
    const std::string process = std::to_string(service.Process());
    const std::set<int> before = DescriptorsOf(process);
    for (int i = 0; i < 200; ++i) {
        const host::Descriptor connection = service.Connect();
        EXPECT_GT(ServingChild(connection), 0);
    }
    service.WaitForChildren(2);
    EXPECT_EQ(DescriptorsOf(process), before);
}

TEST(Pool, AChildHasItsConnectionAndNothingOfItsParent) {
    const std::set<int> before = DescriptorsOf("self");
    const Service service(Limits(2, 10), [&](int connection) {
        std::string text;
        for (const int descriptor : DescriptorsOf("self")) {
            if (before.count(descriptor) == 0) {
                text += descriptor == connection ? "connection " : "other ";
            }
        }
        Write(connection, text);
    });
    EXPECT_EQ(service.Ask(), "connection ");
}

TEST(Pool, AChildHasDefaultSignalsAndASessionOfItsOwn) {
    const Service service(Limits(2, 10), [](int connection) {
        std::string text = StatusLine("self", "SigBlk") + (getsid(0) == getpid() ? " leads" : " follows");
        for (const int number : {SIGCHLD, SIGTERM, SIGINT}) {
            struct sigaction action {};
            text += sigaction(number, nullptr, &action) == 0 && action.sa_handler == SIG_DFL ? " default" : " other";
        }
        Write(connection, text);
    });
    EXPECT_EQ(service.Ask(), "0000000000000000 leads default default default");
}

}  // namespace
