// The file of the shares.
#include "standalone/shares/share_file.h"

#include "fuzz/target.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto shares = velt::parseShares(velt::fuzz::textOf(data, size));
    velt::fuzz::check(shares || !shares.error().message.empty(), "a refusal has a reason");
    velt::fuzz::check(!shares || velt::checkShares(*shares), "what is read can be the shares of a server");
    return 0;
}
