#include "host/api/session_query.h"

#include "base/utf8.h"
#include "host/base/query_text.h"

#include <algorithm>
#include <array>

namespace velt::host {

namespace {

constexpr std::size_t longestReason = 200;

/// `take` returns false for a value other than the expected.
struct Parameter {
    const char* key;
    const char* expected;
    bool ofFilter; ///< else it says how sessions are ended
    bool (*take)(const std::string& value, SessionQuery& query);
};

// An empty value is no filter, or a request to end the sessions of nobody would end all.
constexpr std::array<Parameter, 5> parameters{{
    {"user", "the name of a user", true,
     [](const std::string& value, SessionQuery& query) {
         query.filter.user = value;
         return !value.empty();
     }},
    {"address", "an address or a network, such as 192.0.2.0/24", true,
     [](const std::string& value, SessionQuery& query) {
         query.filter.address = parseIpNetwork(value);
         return query.filter.address.has_value();
     }},
    {"protocol", "ftp, ftps or sftp", true,
     [](const std::string& value, SessionQuery& query) {
         query.filter.protocol = protocolNamed(value);
         return query.filter.protocol.has_value();
     }},
    {"reason", "at most 200 bytes of characters that can be seen", false,
     [](const std::string& value, SessionQuery& query) {
         query.reason = value;
         return value.size() <= longestReason && !holdsUnseen(value);
     }},
    {"dry_run", "true or false", false,
     [](const std::string& value, SessionQuery& query) {
         query.dryRun = value == "true" || value == "1";
         return query.dryRun || value == "false" || value == "0";
     }},
}};

bool isOf(const Parameter& parameter, SessionMethod method) {
    return method == SessionMethod::endSome || parameter.ofFilter == (method == SessionMethod::list);
}

FieldError unknown(const std::string& key, SessionMethod method) {
    switch (method) {
    case SessionMethod::list:
        return {key, "one of user, address or protocol"};
    case SessionMethod::end:
        return {key, "reason or dry_run"};
    default:
        return {key, "one of user, address, protocol, reason or dry_run"};
    }
}

} // namespace

bool SessionFilter::matches(const OpenSession& session) const {
    if (address) {
        const auto client = parseIpAddress(session.address);
        if (!client || !address->contains(*client)) {
            return false;
        }
    }
    return (!user || *user == session.user) && (!protocol || *protocol == session.protocol);
}

std::variant<SessionQuery, FieldError> parseSessionQuery(const std::string& query, SessionMethod method) {
    SessionQuery result;
    const auto given = queryParameters(query);
    if (const auto repeated = repeatedKey(given)) {
        return FieldError{*repeated, oneValue};
    }
    for (const auto& [key, value] : given) {
        const auto* const known = std::ranges::find(parameters, key, &Parameter::key);
        if (known == parameters.end() || !isOf(*known, method)) {
            return unknown(key, method);
        }
        if (!value || !known->take(*value, result)) {
            return FieldError{key, known->expected};
        }
    }
    if (method == SessionMethod::endSome && result.filter.empty()) {
        return FieldError{"user", "a user, an address or a protocol: which sessions to end"};
    }
    return result;
}

} // namespace velt::host
