#include "standalone/firewall/packet_match.h"

#include <algorithm>
#include <array>

namespace velt {
namespace {

/// What the connection has in the place that a condition looks at: a name, a number, or both for the same.
struct Fact {
    std::string name;
    std::optional<int> number;
    bool notAtAll = false;  ///< there is no such place in the packet
    bool otherwise = false; ///< the value is not known, only that it is not the loopback interface
};

constexpr int tcpNumber = 6;

bool isOneOf(const std::string& word, std::initializer_list<std::string_view> words) {
    return std::ranges::find(words, word) != words.end();
}

std::string textOf(const Json::Value& object, const char* key) {
    return object.isObject() && object[key].isString() ? object[key].asString() : "";
}

std::optional<Fact> payloadFact(const Json::Value& payload, const NewConnection& connection) {
    const std::string protocol = textOf(payload, "protocol");
    const std::string field = textOf(payload, "field");
    if (isOneOf(protocol, {"udp", "udplite", "sctp", "dccp", "icmp", "icmpv6", "igmp", "esp", "ah"}) ||
        protocol == (connection.ipv6 ? "ip" : "ip6")) {
        return Fact{"", {}, true};
    }
    if (isOneOf(protocol, {"tcp", "th"}) && field == "dport") {
        return Fact{"", connection.port};
    }
    if (protocol == "tcp" && field == "flags") {
        return Fact{"syn", {}};
    }
    if (isOneOf(field, {"protocol", "nexthdr"})) {
        return Fact{"tcp", tcpNumber};
    }
    return std::nullopt;
}

std::optional<Fact> metaFact(const std::string& key, const NewConnection& connection) {
    if (key == "l4proto") {
        return Fact{"tcp", tcpNumber};
    }
    if (key == "nfproto") {
        return Fact{connection.ipv6 ? "ipv6" : "ipv4", {}};
    }
    if (key == "protocol") {
        return Fact{connection.ipv6 ? "ip6" : "ip", {}};
    }
    if (isOneOf(key, {"iif", "iifname"})) {
        return connection.fromHere ? Fact{"lo", {}} : Fact{"", {}, false, true};
    }
    return std::nullopt;
}

std::optional<Fact> ctFact(const std::string& key) {
    if (key == "state") {
        return Fact{"new", {}};
    }
    // A connection to this server's own ports is translated by nobody.
    return key == "status" ? std::optional(Fact{"confirmed", {}}) : std::nullopt;
}

/// The flags of the first packet, looked at through a mask.
bool isMaskedFlags(const Json::Value& left) {
    const Json::Value& parts = left["&"];
    return parts.isArray() && !parts.empty() && parts[0].isObject() && parts[0]["payload"].isObject() &&
           textOf(parts[0]["payload"], "field") == "flags";
}

std::optional<Fact> factAt(const Json::Value& left, const NewConnection& connection) {
    if (!left.isObject()) {
        return std::nullopt;
    }
    if (left["payload"].isObject()) {
        return payloadFact(left["payload"], connection);
    }
    if (left["meta"].isObject()) {
        return metaFact(textOf(left["meta"], "key"), connection);
    }
    if (left["ct"].isObject()) {
        return ctFact(textOf(left["ct"], "key"));
    }
    return isMaskedFlags(left) ? std::optional(Fact{"syn", {}}) : std::nullopt;
}

std::optional<bool> equals(const Fact& fact, const Json::Value& value, const NamedElements& elements);

/// Any of them; not to be told as soon as one of them is not, and none is.
std::optional<bool> equalsAny(const Fact& fact, const Json::Value& values, const NamedElements& elements) {
    std::optional<bool> any = false;
    for (const Json::Value& each : values) {
        const auto equal = equals(fact, each, elements);
        if (equal.value_or(false)) {
            return true;
        }
        any = equal ? any : equal;
    }
    return any;
}

std::optional<bool> equalsText(const Fact& fact, const std::string& text, const NamedElements& elements) {
    if (text.starts_with('@')) {
        const Json::Value* const named = elements(text.substr(1));
        return named != nullptr ? equalsAny(fact, *named, elements) : std::nullopt;
    }
    if (fact.otherwise) {
        return text == "lo" ? std::optional(false) : std::nullopt;
    }
    if (fact.name.empty() || text.ends_with('*')) {
        return std::nullopt; // a number by a name
    }
    return text == fact.name;
}

std::optional<bool> equals(const Fact& fact, const Json::Value& value, const NamedElements& elements) {
    if (value.isString()) {
        return equalsText(fact, value.asString(), elements);
    }
    if (value.isInt()) {
        return fact.number ? std::optional(value.asInt() == *fact.number) : std::nullopt;
    }
    if (value.isArray()) {
        return equalsAny(fact, value, elements);
    }
    if (!value.isObject()) {
        return std::nullopt;
    }
    if (value["set"].isArray()) {
        return equalsAny(fact, value["set"], elements);
    }
    if (value["elem"].isObject()) {
        return equals(fact, value["elem"]["val"], elements);
    }
    const Json::Value& range = value["range"];
    const bool isRange =
        fact.number && range.isArray() && range.size() == 2 && range[0].isInt() && range[1].isInt();
    return isRange ? std::optional(*fact.number >= range[0].asInt() && *fact.number <= range[1].asInt())
                   : std::nullopt;
}

std::optional<bool> compares(const std::string& op, const Fact& fact, const Json::Value& right,
                             const NamedElements& elements) {
    if (op == "==" || op == "in" || op == "!=") {
        const auto equal = equals(fact, right, elements);
        return equal ? std::optional(*equal == (op != "!=")) : std::nullopt;
    }
    if (!fact.number || !right.isInt()) {
        return std::nullopt;
    }
    const int limit = right.asInt();
    if (op == "<") {
        return *fact.number < limit;
    }
    if (op == ">") {
        return *fact.number > limit;
    }
    if (op == "<=") {
        return *fact.number <= limit;
    }
    return op == ">=" ? std::optional(*fact.number >= limit) : std::nullopt;
}

/// The pairs of key and verdict.
const Json::Value* pairsOf(const Json::Value& data, const NamedElements& elements) {
    if (data.isString() && data.asString().starts_with('@')) {
        return elements(data.asString().substr(1));
    }
    return data.isObject() && data["set"].isArray() ? &data["set"] : nullptr;
}

} // namespace

std::optional<bool> isMet(const Json::Value& match, const NewConnection& connection,
                          const NamedElements& elements) {
    if (!match.isObject()) {
        return std::nullopt;
    }
    const auto fact = factAt(match["left"], connection);
    if (!fact) {
        return std::nullopt;
    }
    return fact->notAtAll ? std::optional(false)
                          : compares(textOf(match, "op"), *fact, match["right"], elements);
}

std::optional<Json::Value> verdictOf(const Json::Value& map, const NewConnection& connection,
                                     const NamedElements& elements) {
    const auto fact = map.isObject() ? factAt(map["key"], connection) : std::nullopt;
    const Json::Value* const pairs = fact ? pairsOf(map["data"], elements) : nullptr;
    if (pairs == nullptr) {
        return std::nullopt;
    }
    if (fact->notAtAll) {
        return Json::Value();
    }
    for (const Json::Value& pair : *pairs) {
        const bool isPair = pair.isArray() && pair.size() == 2;
        const auto equal = isPair ? equals(*fact, pair[0], elements) : std::nullopt;
        if (!equal) {
            return std::nullopt;
        }
        if (*equal) {
            return pair[1];
        }
    }
    return Json::Value();
}

} // namespace velt
