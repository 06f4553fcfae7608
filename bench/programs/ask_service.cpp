// Asks a service at its socket the same again and again, over a new connection each time:
//
//   ask_service SOCKET CLIENTS SECONDS ANSWER   asks for so long, 0 for once, with so many clients at once
//
// The message comes from standard input. Prints the seconds that each query took, from the connect to the whole answer,
// and at last, behind "total", how long all took and this program's own processor time. Any answer but the one named is
// an error.

#include <sys/resource.h>
#include <zovadaemon.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <iostream>
#include <iterator>
#include <string>
#include <thread>
#include <vector>

namespace {

using Clock = std::chrono::steady_clock;
using Seconds = std::chrono::duration<double>;

struct Client {
    std::vector<Seconds> taken;
    std::string problem;
};

std::string AskOnce(const std::string& path, const std::string& message, const std::string& expected) {
    std::string answer;
    zovadaemon::DomainSockConnection connection(path);
    if (!connection.Connect() || !connection.Send(message) || !connection.Recv(answer)) {
        return "no answer";
    }
    return answer == expected ? "" : "answered " + answer;
}

Seconds ProcessorTime() {
    rusage usage{};
    getrusage(RUSAGE_SELF, &usage);
    return std::chrono::seconds(usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) +
           std::chrono::microseconds(usage.ru_utime.tv_usec + usage.ru_stime.tv_usec);
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 5) {
        std::cerr << "usage: ask_service SOCKET CLIENTS SECONDS ANSWER\n";
        return EXIT_FAILURE;
    }
    const std::string path = argv[1];
    const std::string expected = argv[4];
    const std::string message{std::istreambuf_iterator<char>(std::cin), {}};
    std::vector<Client> clients(std::strtoul(argv[2], nullptr, 10));
    std::vector<std::thread> threads;
    const Seconds processorBefore = ProcessorTime();
    const Clock::time_point begin = Clock::now();
    const Clock::time_point end = begin + std::chrono::seconds(std::atoi(argv[3]));
    for (Client& client : clients) {
        threads.emplace_back([&] {
            do {
                const Clock::time_point asked = Clock::now();
                client.problem = AskOnce(path, message, expected);
                client.taken.emplace_back(Clock::now() - asked);
            } while (client.problem.empty() && Clock::now() < end);
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    const Seconds total = Clock::now() - begin;
    for (const Client& client : clients) {
        if (!client.problem.empty()) {
            std::cerr << path << ": " << client.problem << '\n';
            return EXIT_FAILURE;
        }
        for (const Seconds taken : client.taken) {
            printf("%.7f\n", taken.count());
        }
    }
    printf("total %.7f %.7f\n", total.count(), (ProcessorTime() - processorBefore).count());
}
