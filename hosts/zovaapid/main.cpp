// The API daemon: runs the calls of APIs whose description names its socket.

#include "../daemon/Daemon.h"
#include "ForwardedCall.h"

int main(int argc, char** argv) {
    return host::RunDaemon({"zovaapid",
                            "Runs the calls of APIs whose description names its socket in \"socket\", each in a child\n"
                            "of its own. Serves root alone.\n",
                            "", false},
                           argc, argv, host::RunForwardedCall);
}
