// A program outside any web server that makes one call in the name of a user: probe-exec FORM TARGET CALL. FORM is
// "param" or "short"; TARGET is the descriptor that gets the method's standard output, -1 for none; CALL is a JSON
// object of "user", "api", "version", "method" and "params". It tells on descriptor 3 what came back, in which state
// its process was before the call and is after it, and whether a child is left.

#include <sys/wait.h>
#include <unistd.h>
#include <webapi/APIRunner.h>
#include <webapi/ExecParam.h>
#include <webapi/Json.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "ProcessState.h"

namespace {

Json::Value Exec(const char* form, int target, const Json::Value& call) {
    const std::string user = call["user"].asString();
    const std::string api = call["api"].asString();
    const int version = call["version"].asInt();
    const std::string method = call["method"].asString();
    if (strcmp(form, "param") == 0) {
        ZOVA::ExecParam param;
        param.SetParams(call["params"]).SetRunner(user).SetAPI(api).SetVersion(version).SetMethod(method);
        return ZOVA::APIRunner::Exec(param.SetOutputFd(target));
    }
    Json::Value result;
    if (target >= 0) {
        ZOVA::APIRunner::Exec(result, target, api.c_str(), version, method.c_str(), call["params"], Json::Value(),
                              user.c_str());
    } else {
        ZOVA::APIRunner::Exec(result, api.c_str(), version, method.c_str(), call["params"], user.c_str());
    }
    return result;
}

}  // namespace

int main(int argc, char** argv) {
    constexpr int kReport = 3;
    Json::Value call;
    if (argc != 4 || !Json::fromString(call, argv[3]) || call.type() != Json::objectValue) {
        return EXIT_FAILURE;
    }
    Json::Value report(Json::objectValue);
    report["before"] = probe::ProcessState();
    report["result"] = Exec(argv[1], atoi(argv[2]), call);
    report["after"] = probe::ProcessState();
    report["child_left"] = waitpid(-1, nullptr, WNOHANG) != -1 || errno != ECHILD;
    const std::string text = Json::toString(report);
    return write(kReport, text.data(), text.size()) == static_cast<ssize_t>(text.size()) ? EXIT_SUCCESS : EXIT_FAILURE;
}
