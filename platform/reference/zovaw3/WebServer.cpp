#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <vector>

#include "Paths.h"
#include "Seam.h"
#include "common/JsonText.h"

namespace zovaw3 {

namespace {

constexpr std::uint16_t kDefaultHttpsPort = 443;

}  // namespace

class Engine::Private {
public:
    /** The command that restarts the web server, as a program's absolute path and its arguments. */
    std::vector<std::string> restart;
    std::uint16_t httpsPort = kDefaultHttpsPort;
};

namespace {

/** The web server's settings; an empty object if there are none that can be trusted. */
Json::Value ReadSettings() {
    constexpr size_t kLargest = 65536;
    Json::Value file;
    const auto read =
        reference::ReadJson(reference::paths::kWebServer, kLargest, reference::FileTrust::kRootOnlyWrites, file);
    return read == reference::ReadResult::kGood && file.isObject() ? file : Json::Value(Json::objectValue);
}

std::vector<std::string> RestartCommandOf(const Json::Value& settings) {
    std::vector<std::string> words;
    if (!settings["restart"].isArray()) {
        return words;
    }
    for (const Json::Value& word : settings["restart"]) {
        if (!word.isString() || word.asString().find('\0') != std::string::npos) {
            return {};
        }
        words.push_back(word.asString());
    }
    return words;
}

std::uint16_t HttpsPortOf(const Json::Value& settings) {
    const Json::Value& port = settings["https_port"];
    return port.isInt() && port.asInt() >= 1 && port.asInt() <= UINT16_MAX ? static_cast<std::uint16_t>(port.asInt())
                                                                           : kDefaultHttpsPort;
}

/** Runs the program with a fixed environment and waits for it. True if it ended with status 0. */
bool RunToSuccess(const std::vector<std::string>& words) {
    std::vector<char*> arguments;
    for (const std::string& word : words) {
        arguments.push_back(const_cast<char*>(word.c_str()));
    }
    arguments.push_back(nullptr);
    char path[] = "PATH=/usr/sbin:/usr/bin:/sbin:/bin";
    char* environment[] = {path, nullptr};

    const pid_t child = fork();
    if (child < 0) {
        return false;
    }
    if (child == 0) {
        execve(arguments[0], arguments.data(), environment);
        _exit(EXIT_FAILURE);
    }
    int status = 0;
    while (waitpid(child, &status, 0) < 0) {
        if (errno != EINTR) {
            return false;
        }
    }
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

}  // namespace

std::shared_ptr<Engine::Private> Engine::CreatePrivate() {
    auto engine = std::make_shared<Private>();
    const Json::Value settings = ReadSettings();
    engine->restart = RestartCommandOf(settings);
    engine->httpsPort = HttpsPortOf(settings);
    return engine;
}

ZELM::ZELM(std::shared_ptr<Engine::Private> given) : engine(std::move(given)) {}

ZELM::~ZELM() = default;

bool ZELM::RestartService() {
    if (!engine || engine->restart.empty() || engine->restart.front().substr(0, 1) != "/") {
        return false;
    }
    return RunToSuccess(engine->restart);
}

std::uint16_t ZELM::GetHttpsPort() {
    return engine ? engine->httpsPort : kDefaultHttpsPort;
}

}  // namespace zovaw3
