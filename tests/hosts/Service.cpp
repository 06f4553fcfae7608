#include "Service.h"

#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>

#include <fstream>
#include <sstream>

namespace {

/** The letter of the process's state; 0 if it is not there. */
char StateOf(pid_t process) {
    std::ifstream file("/proc/" + std::to_string(process) + "/stat");
    std::string text;
    std::getline(file, text);
    const std::size_t name = text.rfind(") ");
    return name == std::string::npos ? '\0' : text[name + 2];
}

std::set<pid_t> AllChildren(pid_t parent) {
    const std::string number = std::to_string(parent);
    std::ifstream file("/proc/" + number + "/task/" + number + "/children");
    std::set<pid_t> found;
    for (pid_t child; file >> child;) {
        found.insert(child);
    }
    return found;
}

}  // namespace

void WaitUntil(const std::function<bool()>& condition, const char* what) {
    const auto limit = std::chrono::steady_clock::now() + std::chrono::milliseconds(kPatience);
    while (!condition()) {
        ASSERT_LT(std::chrono::steady_clock::now(), limit) << "waited in vain until " << what;
        poll(nullptr, 0, 1);
    }
}

bool IsAlive(pid_t process) {
    const char state = StateOf(process);
    return state != '\0' && state != 'Z' && state != 'X';
}

std::set<int> DescriptorsOf(const std::string& process) {
    std::set<int> found;
    for (const auto& entry : std::filesystem::directory_iterator("/proc/" + process + "/fd")) {
        std::error_code gone;
        // The one that lists them is closed again by now.
        if (std::filesystem::read_symlink(entry.path(), gone).string().find("/proc/") == std::string::npos && !gone) {
            found.insert(std::stoi(entry.path().filename()));
        }
    }
    return found;
}

Service::Service(const host::PoolLimits& limits, const host::Serve& serve) : path(folder.In("socket")) {
    // What the service leaves behind comes to this process and not to that of the machine.
    prctl(PR_SET_CHILD_SUBREAPER, 1);
    host::SocketPlace place;
    place.path = path;
    std::string problem;
    std::optional<host::ListeningSocket> socket = host::ListeningSocket::Bind(place, problem);
    if (!socket) {
        ADD_FAILURE() << problem;
        return;
    }
    parent = fork();
    if (parent == 0) {
        host::Pool pool(*socket, limits, serve);
        _exit(pool.Run() ? 0 : 1);
    }
}

Service::~Service() {
    if (parent > 0) {
        for (const pid_t child : AllChildren(parent)) {
            kill(child, SIGKILL);
        }
        kill(parent, SIGKILL);
        waitpid(parent, nullptr, 0);
    }
    for (const pid_t orphan : AllChildren(getpid())) {
        kill(orphan, SIGKILL);
        waitpid(orphan, nullptr, 0);
    }
}

void Service::Signal(int number) const {
    EXPECT_EQ(kill(parent, number), 0);
}

std::string Service::WaitForEnd() {
    WaitUntil([this] { return !IsAlive(parent); }, "the service has ended");
    int status = 0;
    EXPECT_EQ(waitpid(parent, &status, 0), parent);
    parent = -1;
    return WIFEXITED(status) ? "status " + std::to_string(WEXITSTATUS(status))
                             : "signal " + std::to_string(WTERMSIG(status));
}

std::set<pid_t> Service::Children() const {
    std::set<pid_t> found;
    for (const pid_t child : AllChildren(parent)) {
        if (IsAlive(child)) {
            found.insert(child);
        }
    }
    return found;
}

std::set<pid_t> Service::Zombies() const {
    std::set<pid_t> found;
    for (const pid_t child : AllChildren(parent)) {
        if (StateOf(child) == 'Z') {
            found.insert(child);
        }
    }
    return found;
}

void Service::WaitForChildren(std::size_t count) const {
    WaitUntil([&] { return Children().size() == count && Zombies().empty(); }, "there are that many children");
}
