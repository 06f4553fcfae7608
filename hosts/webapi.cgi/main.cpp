// The CGI host: the web server starts one for each HTTP request, in the folder of the description files.

#include <signal.h>
#include <sys/stat.h>
#include <webapi/WebEntry.h>

#include "../common/StandardDescriptors.h"
#include "LastResort.h"

int main(int argc, char** argv) {
    if (!host::OpenStandardDescriptors()) {
        return 1;
    }
    // A client that breaks off must not end the process before it has put everything back and cleaned up.
    ::signal(SIGPIPE, SIG_IGN);
    ::umask(077);
    host::InstallLastResort();
    try {
        ZOVA::WebEntry entry;
        entry.SetArgs(argc, argv);
        entry.Run(Json::Value());
    } catch (...) {
        host::AnswerAsLastResort();
        return 1;
    }
    return 0;
}
