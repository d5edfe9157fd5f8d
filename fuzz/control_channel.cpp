// What is said to a supervisor.
#include "standalone/supervise/control_channel.h"

#include "fuzz/target.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto request = velt::decodeRequest(velt::fuzz::textOf(data, size));
    if (request) {
        const std::string message = velt::encodeRequest(*request);
        const auto again = velt::decodeRequest(message);
        velt::fuzz::check(again && velt::encodeRequest(*again) == message, "a request can be said again");
    }
    return 0;
}
