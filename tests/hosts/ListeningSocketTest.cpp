#include "prefork/ListeningSocket.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/un.h>

#include <cstring>
#include <fstream>

#include "Connect.h"
#include "Folder.h"
#include "prefork/HandedOver.h"

namespace {

using host::Descriptor;
using host::ListeningSocket;
using host::SocketPlace;

class ListeningSocketTest : public ::testing::Test {
protected:
    /** The place "socket" in the folder, with this mode. */
    SocketPlace Place(mode_t mode = 0600) const {
        SocketPlace place;
        place.path = path;
        place.mode = mode;
        return place;
    }

    std::optional<ListeningSocket> Bind() { return ListeningSocket::Bind(Place(), problem); }

    void ExpectRefusal(const SocketPlace& place, const std::string& reason) {
        problem.clear();
        EXPECT_FALSE(ListeningSocket::Bind(place, problem).has_value()) << place.path;
        EXPECT_NE(problem.find(reason), std::string::npos) << problem;
    }

    struct stat Status() const {
        struct stat status {};
        EXPECT_EQ(lstat(path.c_str(), &status), 0);
        return status;
    }

    Folder folder;
    std::string path = folder.In("socket");
    std::string problem;
};

TEST_F(ListeningSocketTest, TakesConnectionsAndRemovesItsPathAtTheEnd) {
    std::optional<ListeningSocket> made = Bind();
    ASSERT_TRUE(made) << problem;
    EXPECT_TRUE(ConnectTo(path).IsOpen());
    EXPECT_NE(fcntl(made->Get(), F_GETFD) & FD_CLOEXEC, 0);
    EXPECT_NE(fcntl(made->Get(), F_GETFL) & O_NONBLOCK, 0);
    made->Stop();
    EXPECT_FALSE(std::filesystem::exists(path));
}

TEST_F(ListeningSocketTest, HasOwnerAndModeWhateverTheUmask) {
    const mode_t before = umask(0077);
    SocketPlace place = Place(0660);
    place.owner = 61001;
    place.group = 61002;
    const std::optional<ListeningSocket> made = ListeningSocket::Bind(place, problem);
    EXPECT_EQ(umask(before), 0077u);
    ASSERT_TRUE(made) << problem;
    EXPECT_EQ(Status().st_mode, mode_t{S_IFSOCK | 0660});
    EXPECT_EQ(Status().st_uid, 61001u);
    EXPECT_EQ(Status().st_gid, 61002u);
}

TEST_F(ListeningSocketTest, ReplacesTheSocketOfAServiceThatHasEnded) {
    ASSERT_TRUE(Bind().has_value());
    ASSERT_FALSE(ConnectTo(path).IsOpen());
    const std::optional<ListeningSocket> made = Bind();
    ASSERT_TRUE(made) << problem;
    EXPECT_TRUE(ConnectTo(path).IsOpen());
}

TEST_F(ListeningSocketTest, LeavesASocketAloneOnWhichAnotherProgramListens) {
    std::optional<ListeningSocket> first = Bind();
    ASSERT_TRUE(first);
    ExpectRefusal(Place(), "another service holds");
    first->LeaveLockToParent();
    ExpectRefusal(Place(), "somebody listens");
    EXPECT_TRUE(ConnectTo(path).IsOpen());
}

TEST_F(ListeningSocketTest, LeavesADatagramSocketAlone) {
    const Descriptor other(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, sizeof(address.sun_path) - 1);
    ASSERT_EQ(bind(other.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)), 0);
    ExpectRefusal(Place(), "somebody listens");
    EXPECT_TRUE(std::filesystem::exists(path));
}

TEST_F(ListeningSocketTest, LeavesAnythingButASocketAlone) {
    std::ofstream(path) << "content";
    ExpectRefusal(Place(), "no socket");
    EXPECT_EQ(std::filesystem::file_size(path), 7u);
    std::filesystem::remove(path);
    std::filesystem::create_directory(path);
    ExpectRefusal(Place(), "no socket");
    std::filesystem::remove(path);
    std::filesystem::create_symlink(folder.In("elsewhere"), path);
    ExpectRefusal(Place(), "no socket");
    EXPECT_TRUE(std::filesystem::is_symlink(path));
}

TEST_F(ListeningSocketTest, RefusesPathsThatNameNoPlace) {
    SocketPlace place;
    for (const std::string& bad :
         {std::string(), std::string("relative"), folder.In(std::string(108, 'x')), folder.In("missing/socket")}) {
        place.path = bad;
        ExpectRefusal(place, bad.find("missing") == std::string::npos ? "no path" : "cannot open");
    }
    place.path = folder.In("");
    place.path += std::string(107 - place.path.size(), 'x');
    EXPECT_TRUE(ListeningSocket::Bind(place, problem).has_value()) << problem;
}

TEST_F(ListeningSocketTest, FollowsNoLinkInPlaceOfItsLock) {
    std::filesystem::create_symlink(folder.In("target"), path + ".lock");
    ExpectRefusal(Place(), "cannot open");
    EXPECT_FALSE(std::filesystem::exists(folder.In("target")));
}

TEST_F(ListeningSocketTest, AtItsEndLeavesWhatAnotherHasPutInItsPlace) {
    std::optional<ListeningSocket> made = Bind();
    ASSERT_TRUE(made);
    std::filesystem::remove(path);
    std::ofstream(path) << "content";
    made->Stop();
    EXPECT_TRUE(std::filesystem::exists(path));
}

TEST_F(ListeningSocketTest, TakesOverASocketThatListensAndNeverRemovesItsPath) {
    std::optional<ListeningSocket> manager = Bind();
    ASSERT_TRUE(manager);
    const int handed = dup(manager->Get());
    std::optional<ListeningSocket> made = ListeningSocket::Adopt(Descriptor(handed), problem);
    ASSERT_TRUE(made) << problem;
    EXPECT_NE(fcntl(handed, F_GETFD) & FD_CLOEXEC, 0);
    EXPECT_NE(fcntl(handed, F_GETFL) & O_NONBLOCK, 0);
    made->Stop();
    EXPECT_TRUE(ConnectTo(path).IsOpen()) << "the manager goes on to listen";
}

TEST_F(ListeningSocketTest, TakesNothingOverThatDoesNotListen) {
    int pair[2];
    ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM, 0, pair), 0);
    const Descriptor other(pair[1]);
    const int rows[] = {pair[0], socket(AF_UNIX, SOCK_DGRAM, 0), socket(AF_UNIX, SOCK_STREAM, 0),
                        open("/dev/null", O_RDWR), 1000};
    for (const int row : rows) {
        problem.clear();
        EXPECT_FALSE(ListeningSocket::Adopt(Descriptor(row), problem)) << row;
        EXPECT_NE(problem, "") << row;
    }
}

struct HandedOverRow {
    const char* name;
    std::string process;
    const char* count;
    int expected;
    bool isProblem;
};

TEST(HandedOver, IsTheOneDescriptorMeantForThisProcessAndLeavesTheEnvironment) {
    const std::string self = std::to_string(getpid());
    const HandedOverRow rows[] = {{"for this process", self, "1", 3, false},
                                  {"for another process", "1" + self, "1", -1, false},
                                  {"for no process", "", "1", -1, false},
                                  {"not a number", self + "x", "1", -1, false},
                                  {"none", self, "0", -1, true},
                                  {"two", self, "2", -1, true},
                                  {"no count", self, "", -1, true},
                                  {"count with text", self, "1x", -1, true}};
    for (const HandedOverRow& row : rows) {
        setenv("LISTEN_PID", row.process.c_str(), 1);
        setenv("LISTEN_FDS", row.count, 1);
        setenv("LISTEN_FDNAMES", "name", 1);
        std::string problem;
        Descriptor taken = host::TakeHandedOver(problem);
        EXPECT_EQ(taken.Release(), row.expected) << row.name;
        EXPECT_EQ(!problem.empty(), row.isProblem) << row.name;
        for (const char* variable : {"LISTEN_PID", "LISTEN_FDS", "LISTEN_FDNAMES"}) {
            EXPECT_EQ(getenv(variable), nullptr) << row.name;
        }
    }
}

TEST(HandedOver, IsNothingWithoutVariables) {
    std::string problem;
    EXPECT_FALSE(host::TakeHandedOver(problem).IsOpen());
    EXPECT_EQ(problem, "");
}

}  // namespace
