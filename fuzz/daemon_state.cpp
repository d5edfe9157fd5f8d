// The file in which a supervisor says what it knows of its daemon.
#include "standalone/supervise/daemon_state.h"

#include "fuzz/target.h"
#include "tests/support/temporary_folder.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const velt::test::TemporaryFolder folder;
    const auto file = folder.path() / "state";
    // The head, which names this boot of the machine.
    velt::fuzz::check(bool(velt::storeDaemonState(file, {})), "a state can be stored");
    const std::string stored = folder.read("state");
    folder.write("state", stored.substr(0, stored.find("state ")) + velt::fuzz::textOf(data, size));
    const auto state = velt::loadDaemonState(file);
    if (state) {
        velt::fuzz::check(bool(velt::storeDaemonState(file, *state)), "what is read can be stored");
        const auto again = velt::loadDaemonState(file);
        velt::fuzz::check(again && again->state == state->state && again->ports == state->ports &&
                              again->reason == state->reason,
                          "what is stored is read again");
    }
    return 0;
}
