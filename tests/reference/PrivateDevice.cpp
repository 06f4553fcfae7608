#include "PrivateDevice.h"

#include <crypt.h>
#include <fcntl.h>
#include <ftw.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <iterator>

namespace {

struct TestAccount {
    const char* name;
    uid_t uid;
    gid_t gid;
    const char* lock;
    const char* expiry;
};

constexpr TestAccount kAccounts[] = {
    {"alice", kAliceUid, kAliceGid, "", ""},
    {"boss", 61002, 61002, "", ""},
    {"primaryboss", 61003, kAdministratorsGid, "", ""},
    {"locked", 61004, 61004, "!", ""},
    {"expired", 61005, 61005, "", "1"},
    {"otherroot", 0, 0, "", ""},
    {"system", 61006, 61006, "", ""},
    {"homeless", 61007, 61007, "", ""},
};

std::string HomeOf(const char* name) {
    return std::string(name) == "homeless" ? "/nonexistent" : InRoot("/home/") + name;
}

void WriteUserDatabase(const std::string& directory) {
    std::string passwd = "root:x:0:0:root:/root:/bin/sh\n";
    std::string shadow = "root:*:19000:0:99999:7:::\n";
    std::string group = "root:x:0:\nadministrators:x:61100:boss,ghost\nfriends:x:61101:alice\nbad/name:x:61102:\n";
    const std::string hash = crypt(kPassword, "$6$rounds=1000$reference$");
    for (const TestAccount& account : kAccounts) {
        const std::string name(account.name);
        const std::string ids = std::to_string(account.uid) + ":" + std::to_string(account.gid);
        passwd += name + ":x:" + ids + "::" + HomeOf(account.name) + ":/bin/sh\n";
        shadow += name + ":" + account.lock + hash + ":19000:0:99999:7::" + account.expiry + ":\n";
        if (account.gid != 0 && account.gid != kAdministratorsGid) {
            group += name + ":x:" + std::to_string(account.gid) + ":\n";
        }
    }
    WriteFile(directory + "/passwd", passwd);
    WriteFile(directory + "/shadow", shadow);
    WriteFile(directory + "/group", group);
    WriteFile(directory + "/nsswitch.conf", "passwd: files\ngroup: files\nshadow: files\n");
    for (const char* file : {"/passwd", "/group", "/nsswitch.conf"}) {
        ASSERT_EQ(chmod((directory + file).c_str(), 0644), 0);
    }
}

int RemoveEntry(const char* path, const struct stat*, int, struct FTW* walk) {
    return walk->level == 0 ? 0 : remove(path);
}

void RemoveContent(const std::string& directory) {
    nftw(directory.c_str(), RemoveEntry, 16, FTW_DEPTH | FTW_PHYS | FTW_MOUNT);
}

void MakeDirectory(const std::string& path, mode_t mode) {
    ASSERT_TRUE(mkdir(path.c_str(), mode) == 0 || errno == EEXIST) << path;
    ASSERT_EQ(chmod(path.c_str(), mode), 0) << path;
}

}  // namespace

void PrivateMachine::SetUp() {
    ASSERT_EQ(geteuid(), 0u) << "these tests need root";
    ASSERT_EQ(unshare(CLONE_NEWNS), 0) << "these tests need a mount namespace of their own";
    ASSERT_EQ(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr), 0);
    ASSERT_EQ(mount("tmpfs", ZOVA_REFERENCE_ROOT, "tmpfs", MS_NOSUID | MS_NODEV, "mode=0755"), 0);
    ASSERT_EQ(mkdir(InRoot("/machine").c_str(), 0755), 0);
    WriteUserDatabase(InRoot("/machine"));
    ASSERT_EQ(mount(InRoot("/machine").c_str(), "/etc", nullptr, MS_BIND, nullptr), 0);
}

std::string InRoot(const std::string& path) {
    return ZOVA_REFERENCE_ROOT + path;
}

void WriteFile(const std::string& path, std::string_view content) {
    for (size_t slash = path.find('/', 1); slash != std::string::npos; slash = path.find('/', slash + 1)) {
        mkdir(path.substr(0, slash).c_str(), 0755);
    }
    std::ofstream file(path, std::ios::binary | std::ios::trunc);
    file.write(content.data(), static_cast<std::streamsize>(content.size()));
    file.close();
    ASSERT_TRUE(file.good()) << path;
    ASSERT_EQ(chmod(path.c_str(), 0600), 0);
}

std::string ReadWholeFile(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(file), {});
}

bool Exists(const std::string& path) {
    struct stat status;
    return lstat(path.c_str(), &status) == 0;
}

unsigned int ModeOf(const std::string& path) {
    struct stat status;
    return lstat(path.c_str(), &status) == 0 ? status.st_mode & 07777u : 0;
}

void MakeOlder(const std::string& path, long seconds) {
    const struct timespec times[2] = {{time(nullptr) - seconds, 0}, {time(nullptr) - seconds, 0}};
    ASSERT_EQ(utimensat(AT_FDCWD, path.c_str(), times, AT_SYMLINK_NOFOLLOW), 0) << path;
}

int StatusOfChild(const std::function<int()>& body) {
    const pid_t child = fork();
    if (child == 0) {
        _exit(body());
    }
    int status = 0;
    if (child < 0 || waitpid(child, &status, 0) != child || !WIFEXITED(status)) {
        return -1;
    }
    return WEXITSTATUS(status);
}

ScopedVariable::ScopedVariable(const char* variable, const char* value) : name(variable) {
    if (const char* old = getenv(variable)) {
        before = old;
    }
    if (value != nullptr) {
        setenv(variable, value, 1);
    } else {
        unsetenv(variable);
    }
}

ScopedVariable::~ScopedVariable() {
    if (before) {
        setenv(name.c_str(), before->c_str(), 1);
    } else {
        unsetenv(name.c_str());
    }
}

void DeviceTest::SetUp() {
    for (const char* folder : {"/etc", "/run", "/var", "/home", "/scratch"}) {
        RemoveContent(InRoot(folder));
        MakeDirectory(InRoot(folder), 0755);
    }
    for (const TestAccount& account : kAccounts) {
        const std::string home = HomeOf(account.name);
        if (home != "/nonexistent") {
            MakeDirectory(home, 0755);
            ASSERT_EQ(chown(home.c_str(), account.uid, account.gid), 0);
        }
    }
}
