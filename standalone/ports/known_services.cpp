#include "standalone/ports/known_services.h"

#include "base/file.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/ports/port_range.h"

#include <sstream>

namespace velt {

std::optional<std::vector<KnownService>> parseKnownServices(std::string_view text, const std::string& file) {
    std::vector<KnownService> services;
    std::istringstream lines{std::string(text)};
    int number = 0;
    for (std::string line; std::getline(lines, line);) {
        ++number;
        std::istringstream words(line.substr(0, line.find('#')));
        std::string ports;
        std::string name;
        std::string rest;
        if (!(words >> ports)) {
            continue;
        }
        const auto range = parsePortRange(ports);
        if (!range || !(words >> name) || words >> rest) {
            fail(ErrorNumber::damaged,
                 "Settings file " + file + ", line " + std::to_string(number) +
                     ": this is not a port, or a range of ports, and a service's name.");
            return std::nullopt;
        }
        services.push_back({range->first, range->last, name});
    }
    return services;
}

std::optional<std::vector<KnownService>> loadKnownServices() {
    const std::filesystem::path file = statePath(paths::knownServices);
    const auto text = readOptionalFile(file);
    if (!text) {
        fail(text.error());
        return std::nullopt;
    }
    return *text ? parseKnownServices(**text, file.string())
                 : parseKnownServices(shippedKnownServices, "known_services.conf, as shipped");
}

} // namespace velt
