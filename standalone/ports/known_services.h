// The ports that this server's other services are known for, whether they run now or not.
#ifndef VELT_STANDALONE_PORTS_KNOWN_SERVICES_H
#define VELT_STANDALONE_PORTS_KNOWN_SERVICES_H

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

struct KnownService {
    int firstPort = 0;
    int lastPort = 0;
    std::string name;

    bool operator==(const KnownService&) const = default;
};

/// The list that is shipped, as the text of its file.
extern const std::string_view shippedKnownServices;

/// Reads such a text; `file` names it in errors. Nothing, with the last error naming file and line, when a
/// line is neither a service, a comment, nor blank.
std::optional<std::vector<KnownService>> parseKnownServices(std::string_view text, const std::string& file);

/// The administrator's list, /etc/velt/known_services.conf below the state root; the shipped one where there
/// is none. Nothing, with the last error set, when it cannot be read.
std::optional<std::vector<KnownService>> loadKnownServices();

} // namespace velt

#endif
