// The rules of the packet filter as nft lists them, and what becomes of a connection by them.
#ifndef VELT_STANDALONE_FIREWALL_LISTED_RULES_H
#define VELT_STANDALONE_FIREWALL_LISTED_RULES_H

#include <json/value.h>

#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// The first packet of a TCP connection to this server.
struct NewConnection {
    int port = 0;
    bool fromHere = false; ///< over the loopback interface
    bool ipv6 = false;
};

/// What is made of a condition that cannot be judged, such as one on the client's address. A rule that drops
/// on such a condition is for some clients, and is passed over either way.
enum class Doubt {
    meetsNone,     ///< a rule that accepts on such a condition is passed over
    meetsAccepting ///< it accepts
};

/// A chain through which all that comes in goes.
struct InputChain {
    std::string family; ///< "inet"
    std::string table;
    std::string name;

    /// As nft names it: "inet filter input".
    std::string fullName() const { return family + " " + table + " " + name; }
};

class ListedRules {
public:
    /// From `nft --json list ruleset`, or a list of chains, which are without rules then. Nothing for a text
    /// that is no such list.
    static std::optional<ListedRules> read(std::string_view listAsJson);

    /// In the order of the list.
    const std::vector<InputChain>& inputChains() const { return inputChains_; }

    /// Whether the chain, with those that it leads to, drops or rejects the connection.
    bool drops(const InputChain& chain, const NewConnection& connection, Doubt doubt) const;

private:
    struct Chain {
        bool dropsRest = false;
        std::vector<Json::Value> rules; ///< their expressions
    };

    ListedRules() = default;
    void add(const Json::Value& entry);

    std::vector<InputChain> inputChains_;
    std::map<std::string, Chain> chains_;          ///< by full name
    std::map<std::string, Json::Value> namedSets_; ///< by full name: the elements of sets and maps

    friend class RuleWalk;
};

} // namespace velt

#endif
