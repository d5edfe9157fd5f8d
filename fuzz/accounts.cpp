// The files of the local accounts: the password file, the group file and login.defs, with a NUL between them.
#include "fuzz/target.h"
#include "standalone/accounts/account_files.h"
#include "standalone/accounts/account_snapshot.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string input = velt::fuzz::textOf(data, size);
    const auto first = std::min(input.find('\0'), input.size());
    const auto second = std::min(input.find('\0', first + 1), input.size());
    const auto part = [&input](std::size_t from, std::size_t to) {
        return from < to ? input.substr(from, to - from) : std::string();
    };
    const auto users = velt::UserSnapshot::make(velt::parsePasswd(part(0, first)), {},
                                                velt::parseLoginDefs(part(second + 1, input.size())));
    const velt::GroupSnapshot groups(velt::parseGroup(part(first + 1, second)));
    for (const velt::UserEntry& user : users->people.users()) {
        velt::fuzz::check(users->people.byName(user.name) != nullptr, "who is listed is found by name");
        velt::fuzz::check(users->people.byId(user.uid) != nullptr, "who is listed is found by number");
        velt::fuzz::check(user.name.find(':') == std::string::npos, "a name is one field");
        groups.groupsOf(user.name);
    }
    return 0;
}
