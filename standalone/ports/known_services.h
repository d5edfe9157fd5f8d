// The ports that this server's other services are known for, whether they run now or not.
#ifndef VELT_STANDALONE_PORTS_KNOWN_SERVICES_H
#define VELT_STANDALONE_PORTS_KNOWN_SERVICES_H

#include "base/result.h"

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

/// Reads such a text; `file` names it in errors. A line that is neither a service, a comment, nor blank is
/// one.
Result<std::vector<KnownService>> parseKnownServices(std::string_view text, const std::string& file);

/// The administrator's list; the shipped one where there is none.
Result<std::vector<KnownService>> loadKnownServices();

} // namespace velt

#endif
