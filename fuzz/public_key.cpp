// A line that holds a public key, and a file of a user's keys.
#include "standalone/keys/public_key.h"

#include "base/text.h"
#include "fuzz/target.h"
#include "standalone/keys/key_store.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string input = velt::fuzz::textOf(data, size);
    if (const auto key = velt::parsePublicKey(input)) {
        velt::fuzz::check(velt::parsePublicKey(velt::toText(*key)) == *key, "a key can be read again");
        const std::string line = velt::lineForDaemon(*key);
        velt::fuzz::check(line.find('\n') == line.size() - 1, "it is one line");
        velt::fuzz::check(line.starts_with("restrict"), "it is restricted");
        const std::string options = velt::lowerCase(line.substr(0, *velt::lengthOfOptions(line)));
        velt::fuzz::check(options.find("command") == std::string::npos, "it has no command");
    }
    if (const auto file = velt::parseKeyFile("anna", input)) {
        velt::fuzz::check(file->user == "anna", "the file is the user's");
        velt::fuzz::check(velt::keysForDaemon(*file, file->uid + 1).empty(), "it is of one account");
    }
    return 0;
}
