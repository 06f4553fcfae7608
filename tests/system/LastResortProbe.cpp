// Stands in for a host program whose call ends by an exception: last-resort-probe MOMENT.

#include <cstdio>
#include <stdexcept>
#include <string>

#include "LastResort.h"

namespace {

struct ThrowsAtItsEnd {
    ~ThrowsAtItsEnd() { Throw(); }
    static void Throw() { throw std::runtime_error("probe"); }
};

void Call(const std::string& moment) {
    if (moment == "after a header block") {
        std::fputs("Content-type: text/plain\r\n\r\n", stdout);
    } else if (moment == "after output has left") {
        std::fputs("Content-type: text/plain\r\n\r\npart", stdout);
        std::fflush(stdout);
    } else if (moment == "in a destructor") {
        const ThrowsAtItsEnd end;
        return;
    }
    ThrowsAtItsEnd::Throw();
}

}  // namespace

int main(int argc, char** argv) {
    host::InstallLastResort();
    try {
        Call(argc > 1 ? argv[1] : "");
    } catch (...) {
        host::AnswerAsLastResort();
        return 1;
    }
    return 0;
}
