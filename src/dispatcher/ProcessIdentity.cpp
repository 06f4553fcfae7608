#include <fcntl.h>
#include <libgen.h>
#include <sys/prctl.h>
#include <syslog.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>

#include "base/Log.h"
#include "base/Printable.h"
#include "base/UniqueFd.h"
#include "dispatcher/APIRunnerPrivate.h"

extern char* __progname;

namespace ZOVA {

namespace {

constexpr std::size_t kShortNameSize = 17;
constexpr std::size_t kThreadNameSize = 16;

/** Syslog keeps the pointer, so the ident has to outlive every runner. */
char titleBuffer[kTitleSize];
char shortNameBuffer[kShortNameSize];

/** Base name of the command that started the process, up to its first blank. */
std::string StartName() {
    base::UniqueFd file(open("/proc/self/cmdline", O_RDONLY | O_CLOEXEC));
    char command[4096] = "";
    if (!file.IsOpen() || read(file.Get(), command, sizeof(command) - 1) <= 0) {
        return __progname;
    }
    command[strcspn(command, " ")] = '\0';
    return basename(command);
}

void SetIdent() {
    closelog();
    openlog(titleBuffer, LOG_PID | LOG_CONS, 0);
}

}  // namespace

APIRunnerPrivate::APIRunnerPrivate(APIRunner* owner)
    : runner(owner), argv0Address(nullptr), argv0Size(0), procName(StartName()), origProcName(procName) {}

APIRunnerPrivate::~APIRunnerPrivate() = default;

void APIRunnerPrivate::SetArgs(int argc, char** argv) {
    if (argc < 1) {
        return;
    }
    argv0Address = argv[0];
    argv0Size = strlen(argv0Address);
    if (origProcName.find("__") != std::string::npos) {
        procName = origProcName.substr(0, origProcName.find('_'));
        SetArgv0(procName);
    }
}

void APIRunnerPrivate::SetArgv0(const std::string& name) {
    if (argv0Address == nullptr) {
        return;
    }
    memset(argv0Address, 0, argv0Size);
    snprintf(argv0Address, argv0Size, "%s", name.c_str());
}

bool APIRunnerPrivate::SetCallName(const std::string& api, int version, const std::string& method) {
    // The names come from the client before they are looked up, and the ident stands in every log line.
    const std::string printableApi = base::Printable(api);
    const std::string printableMethod = base::Printable(method);
    snprintf(titleBuffer, sizeof(titleBuffer), "%s_%s_%d_%s", procName.c_str(), printableApi.c_str(), version,
             printableMethod.c_str());
    SetIdent();
    SetArgv0(titleBuffer);
    snprintf(shortNameBuffer, sizeof(shortNameBuffer), "%s_%d_%s", printableApi.c_str(), version,
             printableMethod.c_str());
    if (prctl(PR_SET_NAME, shortNameBuffer) < 0) {
        WEBAPI_LOG(LOG_ERR, "Set process name fail[%m]");
        return false;
    }
    return true;
}

void APIRunnerPrivate::RestoreName() {
    SetArgv0(origProcName);
    snprintf(titleBuffer, sizeof(titleBuffer), "%s", origProcName.c_str());
    SetIdent();
    prctl(PR_SET_NAME, origProcName.substr(0, kThreadNameSize).c_str());
}

}  // namespace ZOVA
