#pragma once

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <map>

#include "PrivateDevice.h"
#include "httpfileoutputer.h"

using Variables = std::map<std::string, std::string>;

/** What a program sent that had written one header line of its own before. */
struct Sent {
    /** The outputer's result; -1 if the program did not end by itself. */
    int result = -1;
    std::string bytes;

    std::string Head() const { return bytes.substr(0, bytes.find("\r\n\r\n") + 2); }
    std::string Body() const { return bytes.substr(bytes.find("\r\n\r\n") + 4); }
    /** Value of a header line; "none" if there is none. */
    std::string Value(const std::string& name) const {
        const std::string head = "\r\n" + Head();
        const size_t begin = head.find("\r\n" + name + ": ");
        if (begin == std::string::npos) {
            return "none";
        }
        const size_t value = begin + 4 + name.size();
        return head.substr(value, head.find("\r\n", value) - value);
    }
};

constexpr int kGood = 0;
constexpr int kFailed = 1;

/** Runs the program with descriptor 1 at `output`, with these CGI variables and SIGPIPE as a program finds it. */
inline int ResultOf(int output, const Variables& variables, const std::function<bool()>& body) {
    fflush(stdout);
    return StatusOfChild([&] {
        signal(SIGPIPE, SIG_DFL);
        if (dup2(output, STDOUT_FILENO) < 0) {
            return 9;
        }
        for (const auto& [name, value] : variables) {
            setenv(name.c_str(), value.c_str(), 1);
        }
        printf("X-Own: 1\r\n");
        const int result = body() ? kGood : kFailed;
        return fflush(stdout) == 0 ? result : 8;
    });
}

class FileOutputer : public DeviceTest {
protected:
    void SetUp() override {
        DeviceTest::SetUp();
        WriteFile(InRoot("/etc/mime.types"), "text/plain txt\n");
        path = InRoot("/scratch-download/a.txt");
        Write("0123456789");
    }

    void Write(const std::string& content) {
        unlink(path.c_str());
        WriteFile(path, content);
        MakeOlder(path, 100);
    }

    static Sent Answer(const Variables& variables, const std::function<bool()>& body) {
        const int file = memfd_create("answer", MFD_CLOEXEC);
        Sent sent;
        sent.result = ResultOf(file, variables, body);
        char part[65536];
        ssize_t got;
        while ((got = pread(file, part, sizeof(part), static_cast<off_t>(sent.bytes.size()))) > 0) {
            sent.bytes.append(part, static_cast<size_t>(got));
        }
        close(file);
        return sent;
    }

    Sent Answer(const Variables& variables = {}) const { return AnswerOf(path, variables); }

    static Sent AnswerOf(const std::string& file, const Variables& variables = {}) {
        Variables all = {{"REQUEST_METHOD", "GET"}};
        for (const auto& [name, value] : variables) {
            all[name] = value;
        }
        return Answer(all, [&] { return HTTPFileOutputer().Output(file, "text/plain"); });
    }

    static Sent AnswerOfStream(FILE* stream, const std::string& name = "", const Variables& variables = {}) {
        Variables all = {{"REQUEST_METHOD", "GET"}};
        all.insert(variables.begin(), variables.end());
        return Answer(all, [&] { return HTTPFileOutputer().Output(stream, name, "text/csv"); });
    }

    std::string path;
};
