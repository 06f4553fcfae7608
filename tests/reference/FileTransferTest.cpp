#include <thread>

#include "FileOutputerFixture.h"

namespace {

// ---- the way to the client ----

TEST_F(FileOutputer, AClientThatIsGoneIsAFailureAndEndsNoProcess) {
    Write(std::string(1 << 20, 'x'));
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    close(ends[0]);
    EXPECT_EQ(ResultOf(ends[1], {},
                       [&] {
                           const bool result = HTTPFileOutputer().Output(path, "a/b");
                           // What was not written must not be tried again at the end of the program.
                           return freopen("/dev/null", "w", stdout) == nullptr || result;
                       }),
              kFailed);
    close(ends[1]);
}

TEST_F(FileOutputer, AClientThatBreaksOffEndsTheTransferAndNoProcess) {
    Write(std::string(1 << 22, 'x'));
    for (const bool isSocket : {false, true}) {
        int ends[2];
        ASSERT_EQ(isSocket ? socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) : pipe2(ends, O_CLOEXEC), 0);
        std::thread client([&] {
            char part[1000];
            EXPECT_GT(read(ends[0], part, sizeof(part)), 0);
            close(ends[0]);
        });
        EXPECT_EQ(ResultOf(ends[1], {},
                           [&] {
                               close(ends[0]);
                               return HTTPFileOutputer().Output(path, "a/b");
                           }),
                  kFailed);
        client.join();
        close(ends[1]);
    }
}

TEST_F(FileOutputer, AnOutputThatDoesNotWaitGetsAllOfIt) {
    Write(std::string(1 << 22, 'x'));
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    ASSERT_EQ(fcntl(ends[1], F_SETFL, O_NONBLOCK), 0);
    std::string got;
    std::thread client([&] {
        char part[65536];
        for (ssize_t more; (more = read(ends[0], part, sizeof(part))) > 0;) {
            got.append(part, static_cast<size_t>(more));
        }
    });
    EXPECT_EQ(ResultOf(ends[1], {}, [&] { return HTTPFileOutputer().Output(path, "a/b"); }), kGood);
    close(ends[1]);
    client.join();
    close(ends[0]);
    EXPECT_EQ(got.size() - (got.find("\r\n\r\n") + 4), size_t{1} << 22);
}

TEST_F(FileOutputer, AnOutputThatTheKernelCannotJoinIsCopiedTo) {
    // sendfile refuses a descriptor that only appends.
    const std::string place = InRoot("/scratch-download/appended");
    unlink(place.c_str());
    const int file = open(place.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600);
    EXPECT_EQ(ResultOf(file, {{"REQUEST_METHOD", "GET"}, {"HTTP_RANGE", "bytes=2-8"}},
                       [&] { return HTTPFileOutputer().Output(path, "a/b"); }),
              kGood);
    close(file);
    const std::string got = ReadWholeFile(place);
    EXPECT_EQ(got.substr(got.find("\r\n\r\n") + 4), "2345678");
}

TEST_F(FileOutputer, SignalsDuringTheTransferDoNotEndIt) {
    Write(std::string(1 << 22, 'x'));
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    size_t got = 0;
    std::thread client([&] {
        char part[4096];
        for (ssize_t more; (more = read(ends[0], part, sizeof(part))) > 0;) {
            got += static_cast<size_t>(more);
        }
    });
    EXPECT_EQ(ResultOf(ends[1], {},
                       [&] {
                           struct sigaction action {};
                           action.sa_handler = [](int) {};
                           sigaction(SIGALRM, &action, nullptr);
                           const struct itimerval often = {{0, 500}, {0, 500}};
                           setitimer(ITIMER_REAL, &often, nullptr);
                           const bool result = HTTPFileOutputer().Output(path, "a/b");
                           const struct itimerval never = {};
                           setitimer(ITIMER_REAL, &never, nullptr);
                           return result;
                       }),
              kGood);
    close(ends[1]);
    client.join();
    close(ends[0]);
    EXPECT_GT(got, size_t{1} << 22);
}

TEST_F(FileOutputer, AFileThatShrinksEndsTheTransferWithoutOtherBytes) {
    constexpr size_t kSize = 1 << 22;
    Write(std::string(kSize, 'x'));
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    std::string got;
    std::thread client([&] {
        char part[4096];
        // The transfer waits for the pipe when the first bytes of the content are here.
        ssize_t more;
        while ((more = read(ends[0], part, sizeof(part))) > 0) {
            got.append(part, static_cast<size_t>(more));
            if (got.size() > kSize / 4 && got.size() <= kSize / 4 + sizeof(part)) {
                EXPECT_EQ(truncate(path.c_str(), kSize / 2), 0);
            }
        }
    });
    EXPECT_EQ(ResultOf(ends[1], {}, [&] { return HTTPFileOutputer().Output(path, "a/b"); }), kFailed);
    close(ends[1]);
    client.join();
    close(ends[0]);
    const std::string body = got.substr(got.find("\r\n\r\n") + 4);
    EXPECT_EQ(body.size(), kSize / 2);
    EXPECT_EQ(body.find_first_not_of('x'), std::string::npos);
    EXPECT_NE(got.find("Content-Length: 4194304\r\n"), std::string::npos);
}

TEST_F(FileOutputer, LeavesNoDescriptorAndNoBlockedSignalBehind) {
    EXPECT_EQ(Answer({},
                     [&] {
                         const int before = dup(0);
                         close(before);
                         HTTPFileOutputer().Output(path, "a/b");
                         const int after = dup(0);
                         sigset_t blocked;
                         sigemptyset(&blocked);
                         pthread_sigmask(SIG_BLOCK, nullptr, &blocked);
                         return before == after && sigismember(&blocked, SIGPIPE) == 0;
                     })
                  .result,
              kGood);
}

}  // namespace
