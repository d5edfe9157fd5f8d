#include "standalone/firewall/listed_rules.h"

#include "base/json_text.h"
#include "standalone/firewall/packet_match.h"

namespace velt {
namespace {

std::string textOf(const Json::Value& object, const char* key) {
    return object[key].isString() ? object[key].asString() : "";
}

std::string tableOf(const Json::Value& object) {
    return textOf(object, "family") + " " + textOf(object, "table");
}

/// The kernel allows no more jumps into each other.
constexpr int deepest = 16;

} // namespace

/// One connection's way through the chains of a table.
class RuleWalk {
public:
    RuleWalk(const ListedRules& rules, std::string table, NewConnection connection, Doubt doubt)
        : rules_(rules), table_(std::move(table)), connection_(connection), doubt_(doubt),
          elements_([this](const std::string& name) { return elementsOf(name); }) {}

    bool isDropped(const std::string& base) const {
        const auto chain = rules_.chains_.find(table_ + " " + base);
        const Fate fate = throughChain(base, 0);
        return fate == Fate::dropped ||
               (fate != Fate::accepted && chain != rules_.chains_.end() && chain->second.dropsRest);
    }

private:
    enum class Fate {
        open,     ///< the next rule decides
        returned, ///< the chain before this one decides
        accepted,
        dropped,
    };

    const Json::Value* elementsOf(const std::string& name) const {
        const auto found = rules_.namedSets_.find(table_ + " " + name);
        return found == rules_.namedSets_.end() ? nullptr : &found->second;
    }

    Fate throughChain(const std::string& name, int depth) const {
        const auto chain = rules_.chains_.find(table_ + " " + name);
        if (chain == rules_.chains_.end() || depth > deepest) {
            return Fate::open;
        }
        for (const Json::Value& rule : chain->second.rules) {
            const Fate fate = throughRule(rule, depth);
            if (fate != Fate::open) {
                return fate == Fate::returned ? Fate::open : fate;
            }
        }
        return Fate::open;
    }

    Fate throughRule(const Json::Value& rule, int depth) const {
        bool certain = true;
        for (const Json::Value& part : rule) {
            if (!part.isObject()) {
                certain = false;
            } else if (part.isMember("match")) {
                const auto met = isMet(part["match"], connection_, elements_);
                if (met && !*met) {
                    return Fate::open;
                }
                certain = certain && met;
            } else if (const Fate fate = byStatement(part, depth, certain); fate != Fate::open) {
                return fate;
            }
        }
        return Fate::open;
    }

    /// What a statement does, and of what it cannot be told for whom, what remains of that.
    Fate byStatement(const Json::Value& part, int depth, bool& certain) const {
        if (part.isMember("vmap")) {
            return byMap(part["vmap"], depth, certain);
        }
        if (isVerdict(part)) {
            return limited(byVerdict(part, depth), certain);
        }
        const bool harmless = part.isMember("counter") || part.isMember("log") || part.isMember("mangle");
        certain = certain && harmless; // such as a limit
        return Fate::open;
    }

    static bool isVerdict(const Json::Value& part) {
        for (const char* each : {"accept", "drop", "reject", "jump", "goto", "return"}) {
            if (part.isMember(each)) {
                return true;
            }
        }
        return false;
    }

    Fate limited(Fate fate, bool certain) const {
        const bool accepts = fate == Fate::accepted && doubt_ == Doubt::meetsAccepting;
        return certain || accepts ? fate : Fate::open;
    }

    Fate byMap(const Json::Value& map, int depth, bool certain) const {
        const auto verdict = verdictOf(map, connection_, elements_);
        if (verdict) {
            return verdict->isObject() ? limited(byVerdict(*verdict, depth), certain) : Fate::open;
        }
        const Json::Value& pairs =
            map.isObject() && map["data"].isObject() ? map["data"]["set"] : Json::Value::nullSingleton();
        for (const Json::Value& pair : pairs) {
            const bool isPair = pair.isArray() && pair.size() == 2 && pair[1].isObject();
            if (isPair && limited(byVerdict(pair[1], depth), false) == Fate::accepted) {
                return Fate::accepted;
            }
        }
        return Fate::open;
    }

    Fate byVerdict(const Json::Value& verdict, int depth) const {
        if (verdict.isMember("accept")) {
            return Fate::accepted;
        }
        if (verdict.isMember("drop") || verdict.isMember("reject")) {
            return Fate::dropped;
        }
        if (verdict.isMember("return")) {
            return Fate::returned;
        }
        const bool jumps = verdict.isMember("jump");
        const Json::Value& target = jumps ? verdict["jump"] : verdict["goto"];
        if (!target.isObject()) {
            return Fate::open;
        }
        const Fate fate = throughChain(textOf(target, "target"), depth + 1);
        return fate == Fate::open && !jumps ? Fate::returned : fate;
    }

    const ListedRules& rules_;
    std::string table_;
    NewConnection connection_;
    Doubt doubt_;
    NamedElements elements_;
};

std::optional<ListedRules> ListedRules::read(std::string_view listAsJson) {
    const Json::Value root = parseJson(listAsJson).valueOr({});
    if (!root.isObject() || !root["nftables"].isArray()) {
        return std::nullopt;
    }
    ListedRules rules;
    for (const Json::Value& entry : root["nftables"]) {
        if (entry.isObject()) {
            rules.add(entry);
        }
    }
    return rules;
}

void ListedRules::add(const Json::Value& entry) {
    if (const Json::Value& chain = entry["chain"]; chain.isObject()) {
        const InputChain found{textOf(chain, "family"), textOf(chain, "table"), textOf(chain, "name")};
        chains_[found.fullName()].dropsRest = textOf(chain, "policy") == "drop";
        if (textOf(chain, "hook") == "input") {
            inputChains_.push_back(found);
        }
    } else if (const Json::Value& rule = entry["rule"]; rule.isObject() && rule["expr"].isArray()) {
        chains_[tableOf(rule) + " " + textOf(rule, "chain")].rules.push_back(rule["expr"]);
    }
    for (const char* kind : {"set", "map"}) {
        if (const Json::Value& set = entry[kind]; set.isObject()) {
            namedSets_[tableOf(set) + " " + textOf(set, "name")] =
                set["elem"].isArray() ? set["elem"] : Json::Value(Json::arrayValue);
        }
    }
}

bool ListedRules::drops(const InputChain& chain, const NewConnection& connection, Doubt doubt) const {
    return RuleWalk(*this, chain.family + " " + chain.table, connection, doubt).isDropped(chain.name);
}

} // namespace velt
