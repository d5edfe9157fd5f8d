// log-writer ROOT NAME COUNT: logs COUNT entries for the user NAME. Exit code 0 when each was stored.
#include "platform/adminlog.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/standalone.h"

#include <cstdio>
#include <cstdlib>
#include <string>

int main(int argc, char** argv) {
    if (argc != 4) {
        return 2;
    }
    velt::setStateRoot(argv[1]);
    velt::setRequestActor(argv[2], "127.0.0.1");
    const long count = std::strtol(argv[3], nullptr, 10);
    for (long i = 0; i < count; ++i) {
        if (VELTLogSet1(1, 1, 0x11B00024, std::to_string(i).c_str(), "", "", "") < 0) {
            std::fprintf(stderr, "%s\n", velt::lastErrorSentence().c_str());
            return 1;
        }
    }
    return 0;
}
