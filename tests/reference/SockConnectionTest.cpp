#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <thread>

#include "PrivateDevice.h"
#include "zovadaemon.h"
#include "zovadaemon/SocketLimits.h"

namespace {

using std::chrono::milliseconds;
using zovadaemon::DomainSockConnection;
using zovadaemon::SockConnection;

constexpr std::size_t kLargest = 64U * 1024 * 1024;

std::string Length(std::uint64_t length) {
    std::string bytes;
    for (int place = 0; place < 8; ++place) {
        bytes += static_cast<char>(length >> (8 * place) & 0xFF);
    }
    return bytes;
}

void Write(int descriptor, const std::string& bytes) {
    EXPECT_EQ(send(descriptor, bytes.data(), bytes.size(), MSG_NOSIGNAL), static_cast<ssize_t>(bytes.size()));
}

/** Two ends of one connection, with short limits. */
class SockConnectionTest : public ::testing::Test {
protected:
    void SetUp() override {
        reference::socketLimits = {milliseconds(200), milliseconds(200), milliseconds(200)};
        int ends[2];
        ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
        near = ends[0];
        far = ends[1];
    }

    void TearDown() override {
        CloseFar();
        reference::socketLimits = {};
    }

    void CloseFar() {
        if (far >= 0) {
            close(far);
            far = -1;
        }
    }

    /** Receives from what the far end has sent; the error number, 0 for success. */
    int Receive(std::string& text) {
        SockConnection connection(near);
        errno = 0;
        return connection.Recv(text) ? 0 : errno;
    }

    int near = -1;
    int far = -1;
};

// ---- whole texts ----

TEST_F(SockConnectionTest, TextsOfAnySizeArriveWhole) {
    reference::socketLimits.transfer = milliseconds(60'000);
    SockConnection receiving(near);
    SockConnection sending(far);
    far = -1;
    for (const std::size_t size : {0UL, 1UL, 2UL, 7UL, 8UL, 9UL, 255UL, 256UL, 65535UL, 65536UL, 65537UL, 131072UL,
                                   (1UL << 20) + 1, (1UL << 24) + 3, kLargest}) {
        std::string text(size, 'x');
        for (std::size_t at = 0; at < size; at += 251) {
            text[at] = static_cast<char>(at % 256);
        }
        bool sent = false;
        std::thread sender([&] { sent = sending.Send(text); });
        std::string received = "before";
        EXPECT_TRUE(receiving.Recv(received)) << size;
        sender.join();
        EXPECT_TRUE(sent) << size;
        EXPECT_TRUE(received == text) << size;
    }
}

TEST_F(SockConnectionTest, ATextMayHoldAnyBytes) {
    const std::string text("\0a\0\xff\n\r\0", 7);
    SockConnection sending(far);
    far = -1;
    ASSERT_TRUE(sending.Send(text));
    std::string received;
    EXPECT_EQ(Receive(received), 0);
    EXPECT_EQ(received, text);
}

TEST_F(SockConnectionTest, OnTheWireItsLengthComesFirstInEightBytesLowestFirst) {
    SockConnection sending(near);
    ASSERT_TRUE(sending.Send(std::string(258, 'x')));
    char bytes[300];
    ASSERT_EQ(recv(far, bytes, sizeof(bytes), 0), 266);
    EXPECT_EQ(std::string(bytes, 8), Length(258));
    EXPECT_EQ(std::string(bytes + 8, 258), std::string(258, 'x'));
}

TEST_F(SockConnectionTest, TextsInARowAreKeptApart) {
    Write(far, Length(1) + "a" + Length(0) + Length(2) + "bc");
    SockConnection receiving(near);
    std::string text;
    for (const char* expected : {"a", "", "bc"}) {
        EXPECT_TRUE(receiving.Recv(text));
        EXPECT_EQ(text, expected);
    }
}

TEST_F(SockConnectionTest, ATextThatComesByteForByteIsWholeAllTheSame) {
    reference::socketLimits.transfer = milliseconds(60'000);
    std::thread sender([&] {
        for (const char byte : Length(3) + "abc") {
            Write(far, std::string(1, byte));
            std::this_thread::yield();
        }
    });
    std::string text;
    EXPECT_EQ(Receive(text), 0);
    sender.join();
    EXPECT_EQ(text, "abc");
}

// ---- bad frames ----

TEST_F(SockConnectionTest, RefusesALengthAboveTheLimitAtOnceAndLeavesTheTextAlone) {
    for (const std::uint64_t length : {std::uint64_t{kLargest} + 1, std::uint64_t{1} << 30, std::uint64_t{1} << 32,
                                       std::uint64_t{1} << 63, ~std::uint64_t{0}}) {
        int ends[2];
        ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
        Write(ends[1], Length(length));
        SockConnection receiving(ends[0]);
        std::string text = "before";
        EXPECT_FALSE(receiving.Recv(text)) << length;
        EXPECT_EQ(errno, EMSGSIZE) << length;
        EXPECT_EQ(text, "before");
        close(ends[1]);
    }
}

TEST_F(SockConnectionTest, SendsNoTextAboveTheLimit) {
    SockConnection sending(near);
    EXPECT_FALSE(sending.Send(std::string(kLargest + 1, 'x')));
    EXPECT_EQ(errno, EMSGSIZE);
    char byte;
    EXPECT_EQ(recv(far, &byte, 1, MSG_DONTWAIT), -1) << "not even its length";
}

TEST_F(SockConnectionTest, AConnectionThatEndsTooEarlyIsAFailureThatLeavesTheTextAlone) {
    const std::string rows[] = {
        "", "\1", Length(1).substr(0, 7), Length(1), Length(3) + "ab", Length(kLargest) + std::string(70000, 'x')};
    for (const std::string& row : rows) {
        int ends[2];
        ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
        Write(ends[1], row);
        close(ends[1]);
        SockConnection receiving(ends[0]);
        std::string text = "before";
        EXPECT_FALSE(receiving.Recv(text)) << row.size();
        EXPECT_EQ(errno, ECONNRESET) << row.size();
        EXPECT_EQ(text, "before");
    }
}

TEST_F(SockConnectionTest, AnAnswerThatDoesNotBeginEndsByTheTimeLimit) {
    std::string text = "before";
    EXPECT_EQ(Receive(text), ETIMEDOUT);
    EXPECT_EQ(text, "before");
}

TEST_F(SockConnectionTest, ATextThatIsHalfSentAndHeldOpenEndsByTheTimeLimit) {
    for (const std::string& row : {Length(9).substr(0, 5), Length(9) + "half", Length(kLargest) + "a"}) {
        int ends[2];
        ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
        Write(ends[1], row);
        SockConnection receiving(ends[0]);
        std::string text = "before";
        EXPECT_FALSE(receiving.Recv(text)) << row.size();
        EXPECT_EQ(errno, ETIMEDOUT) << row.size();
        EXPECT_EQ(text, "before");
        close(ends[1]);
    }
}

TEST_F(SockConnectionTest, ATextThatComesTooSlowlyEndsByTheTimeLimitOfTheWhole) {
    bool stop = false;
    std::thread sender([&] {
        Write(far, Length(100'000));
        for (int sent = 0; !__atomic_load_n(&stop, __ATOMIC_SEQ_CST) && sent < 100'000; ++sent) {
            send(far, "x", 1, MSG_NOSIGNAL);
            std::this_thread::sleep_for(milliseconds(10));
        }
    });
    std::string text;
    EXPECT_EQ(Receive(text), ETIMEDOUT);
    __atomic_store_n(&stop, true, __ATOMIC_SEQ_CST);
    sender.join();
}

TEST_F(SockConnectionTest, APeerThatReadsNothingEndsASendByTheTimeLimit) {
    SockConnection sending(near);
    EXPECT_FALSE(sending.Send(std::string(std::size_t{8} << 20, 'x')));
    EXPECT_EQ(errno, ETIMEDOUT);
}

TEST_F(SockConnectionTest, APeerThatIsGoneEndsASendWithoutASignal) {
    CloseFar();
    SockConnection sending(near);
    EXPECT_FALSE(sending.Send("text"));
    EXPECT_EQ(errno, EPIPE);
}

// ---- signals, descriptors ----

TEST_F(SockConnectionTest, ASignalDuringTheWaitIsNoFailure) {
    struct sigaction action {};
    struct sigaction before {};
    action.sa_handler = [](int) {};
    ASSERT_EQ(sigaction(SIGUSR1, &action, &before), 0);
    reference::socketLimits.answer = milliseconds(60'000);
    const pthread_t waiting = pthread_self();
    std::thread sender([&] {
        for (int i = 0; i < 20; ++i) {
            pthread_kill(waiting, SIGUSR1);
            std::this_thread::sleep_for(milliseconds(2));
        }
        Write(far, Length(4) + "text");
    });
    std::string text;
    EXPECT_EQ(Receive(text), 0);
    sender.join();
    EXPECT_EQ(text, "text");
    sigaction(SIGUSR1, &before, nullptr);
}

TEST_F(SockConnectionTest, WithoutADescriptorNothingIsSentOrReceived) {
    SockConnection none;
    std::string text = "before";
    EXPECT_FALSE(none.Send("text"));
    EXPECT_EQ(errno, EBADF);
    errno = 0;
    EXPECT_FALSE(none.Recv(text));
    EXPECT_EQ(errno, EBADF) << "at once";
    EXPECT_EQ(text, "before");
    close(near);
}

TEST_F(SockConnectionTest, ClosesItsDescriptorOnceAtItsEndOrBefore) {
    {
        SockConnection connection(near);
        connection.Close();
        connection.Close();
        char byte;
        EXPECT_EQ(recv(far, &byte, 1, MSG_DONTWAIT), 0) << "the end of the connection";
    }
    int ends[2];
    ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
    { const SockConnection connection(ends[0]); }
    EXPECT_EQ(fcntl(ends[0], F_GETFD), -1);
    close(ends[1]);
}

// ---- connecting ----

class DomainSockConnectionTest : public SockConnectionTest {
protected:
    void SetUp() override {
        SockConnectionTest::SetUp();
        close(near);
        path = InRoot("/scratch-socket");
        unlink(path.c_str());
    }

    void TearDown() override {
        close(listening);
        unlink(path.c_str());
        SockConnectionTest::TearDown();
    }

    void Listen(int backlog) {
        listening = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        ASSERT_LT(path.size(), sizeof(address.sun_path));
        path.copy(address.sun_path, sizeof(address.sun_path) - 1);
        ASSERT_EQ(bind(listening, reinterpret_cast<const sockaddr*>(&address), sizeof(address)), 0);
        ASSERT_EQ(listen(listening, backlog), 0);
    }

    void ExpectFailure(const std::string& where, int error) {
        DomainSockConnection connection(where);
        errno = 0;
        EXPECT_FALSE(connection.Connect()) << where;
        EXPECT_EQ(errno, error) << where;
    }

    std::string path;
    int listening = -1;
};

TEST_F(DomainSockConnectionTest, ReachesTheServiceAtThePath) {
    Listen(5);
    DomainSockConnection connection(path);
    ASSERT_TRUE(connection.Connect());
    ASSERT_TRUE(connection.Send("question"));
    SockConnection served(accept(listening, nullptr, nullptr));
    std::string text;
    ASSERT_TRUE(served.Recv(text));
    EXPECT_EQ(text, "question");
    ASSERT_TRUE(served.Send("answer"));
    ASSERT_TRUE(connection.Recv(text));
    EXPECT_EQ(text, "answer");
}

TEST_F(DomainSockConnectionTest, FailsWhereNobodyListens) {
    ExpectFailure(path, ENOENT);
    Listen(5);
    close(listening);
    ExpectFailure(path, ECONNREFUSED);
    listening = -1;
}

TEST_F(DomainSockConnectionTest, FailsForAPathThatIsNoSocket) {
    WriteFile(path, "content");
    ExpectFailure(path, ECONNREFUSED);
    ExpectFailure(InRoot(""), ECONNREFUSED);
}

TEST_F(DomainSockConnectionTest, FailsForAPathThatNoSocketCanHave) {
    ExpectFailure("", ENAMETOOLONG);
    ExpectFailure(std::string(108, 'x'), ENAMETOOLONG);
    ExpectFailure(std::string(1 << 20, 'x'), ENAMETOOLONG);
    ExpectFailure(std::string("\0hidden", 7), ENAMETOOLONG);
    ExpectFailure(path + std::string("\0more", 5), ENAMETOOLONG);
    ExpectFailure(std::string(107, 'x'), ENOENT);
}

TEST_F(DomainSockConnectionTest, AFullQueueEndsAConnectByTheTimeLimit) {
    Listen(0);
    DomainSockConnection first(path);
    ASSERT_TRUE(first.Connect());
    ExpectFailure(path, ETIMEDOUT);
}

}  // namespace
