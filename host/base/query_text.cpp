#include "host/base/query_text.h"

#include "host/base/percent_encoding.h"

#include <algorithm>
#include <set>
#include <sstream>

namespace velt::host {

namespace {

/// HTML forms encode a space as "+".
std::optional<std::string> decoded(std::string text) {
    std::ranges::replace(text, '+', ' ');
    return percentDecoded(text);
}

} // namespace

std::vector<QueryParameter> queryParameters(const std::string& query) {
    std::vector<QueryParameter> parameters;
    std::istringstream parts(query);
    for (std::string part; std::getline(parts, part, '&');) {
        const std::size_t equals = part.find('=');
        parameters.push_back(
            {part.substr(0, equals), decoded(equals == std::string::npos ? "" : part.substr(equals + 1))});
    }
    return parameters;
}

std::optional<std::string> repeatedKey(const std::vector<QueryParameter>& parameters) {
    std::set<std::string> seen;
    for (const QueryParameter& each : parameters) {
        if (!seen.insert(each.key).second) {
            return each.key;
        }
    }
    return std::nullopt;
}

} // namespace velt::host
