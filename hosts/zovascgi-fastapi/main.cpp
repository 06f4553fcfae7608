// The fast API service: runs calls of other parts of the system in the name of the user that they state.

#include "../daemon/Daemon.h"
#include "StatedCall.h"

int main(int argc, char** argv) {
    return host::RunDaemon({"zovascgi-fastapi",
                            "Runs calls in the name of any user that the caller states, without a login. Serves root,\n"
                            "and with --group those whom that trusts to act as any user.\n",
                            "/run/zovascgi-fastapi.sock", true},
                           argc, argv, host::RunStatedCall);
}
