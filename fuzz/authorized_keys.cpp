// The keys of a user for file transfer.
#include "standalone/login/authorized_keys.h"

#include "base/text.h"
#include "fuzz/target.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    constexpr std::string_view ours = "command=\"internal-sftp\",";
    const std::string input = velt::fuzz::textOf(data, size);
    const std::string keys = velt::keysForTransfer(input);
    std::string_view rest = keys;
    while (!rest.empty()) {
        std::string_view line = velt::cut(rest, '\n');
        line.remove_prefix(line.starts_with(ours) ? ours.size() : 0);
        velt::fuzz::check(input.find(line) != std::string::npos, "each key is the user's");
        const std::string options = velt::lowerCase(line.substr(0, line.find_first_of(" \t\"")));
        velt::fuzz::check(options.find("command=") == std::string::npos, "no key has a command of its own");
    }
    velt::fuzz::check(velt::keysForTransfer(keys).size() <= keys.size(), "it only leaves out");
    return 0;
}
