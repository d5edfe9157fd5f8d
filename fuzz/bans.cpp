// The list of bans.
#include "standalone/bans/ban_list.h"

#include "fuzz/target.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto bans = velt::parseBans(velt::fuzz::textOf(data, size));
    velt::fuzz::check(velt::parseBans(velt::renderBans(bans)) == bans, "a list can be read again");
    return 0;
}
