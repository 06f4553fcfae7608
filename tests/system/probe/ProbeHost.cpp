// A CGI host that tells on descriptor 3 in which state its process was before the call and is after it.

#include <unistd.h>
#include <webapi/Json.h>
#include <webapi/WebEntry.h>

#include <iostream>

#include "ProcessState.h"

int main(int argc, char** argv) {
    constexpr int kReport = 3;
    Json::Value report(Json::objectValue);
    report["before"] = probe::ProcessState();
    const std::streambuf* input = std::cin.rdbuf();
    const std::streambuf* output = std::cout.rdbuf();
    {
        ZOVA::WebEntry entry;
        entry.SetArgs(argc, argv);
        entry.Run(Json::Value());
        report["after"] = probe::ProcessState();
        report["streams_back"] = std::cin.rdbuf() == input && std::cout.rdbuf() == output;
    }
    const std::string text = Json::toString(report);
    return write(kReport, text.data(), text.size()) == static_cast<ssize_t>(text.size()) ? 0 : 1;
}
