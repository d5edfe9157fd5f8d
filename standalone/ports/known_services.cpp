#include "standalone/ports/known_services.h"

#include "base/file.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/ports/port_range.h"

#include <sstream>

namespace velt {

Result<std::vector<KnownService>> parseKnownServices(std::string_view text, const std::string& file) {
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
            return Error(ErrorNumber::damaged, "Cannot read " + file + ", line " + std::to_string(number) +
                                                   ": expected a port or a range of ports, and a name.");
        }
        services.push_back({range->first, range->last, name});
    }
    return services;
}

Result<std::vector<KnownService>> loadKnownServices() {
    const std::filesystem::path file = statePath(paths::knownServices);
    VELT_ASSIGN_OR_RETURN(const auto text, readOptionalFile(file));
    return text ? parseKnownServices(*text, file.string())
                : parseKnownServices(shippedKnownServices, "known_services.conf, as shipped");
}

} // namespace velt
