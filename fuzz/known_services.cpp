// The list of the ports of other services.
#include "standalone/ports/known_services.h"

#include "fuzz/target.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto services = velt::parseKnownServices(velt::fuzz::textOf(data, size), "list");
    velt::fuzz::check(services || !services.error().message.empty(), "a refusal has a reason");
    if (services) {
        for (const velt::KnownService& service : *services) {
            velt::fuzz::check(0 < service.firstPort && service.firstPort <= service.lastPort &&
                                  service.lastPort <= 65535,
                              "a service has ports");
        }
    }
    return 0;
}
