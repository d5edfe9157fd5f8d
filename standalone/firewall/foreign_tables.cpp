#include "standalone/firewall/foreign_tables.h"

#include "base/json_text.h"

namespace velt {

std::vector<std::string> foreignDropChains(std::string_view chainsAsJson) {
    const Json::Value root = parseJson(chainsAsJson).valueOr({});
    std::vector<std::string> found;
    if (!root.isObject() || !root["nftables"].isArray()) {
        return found;
    }
    const auto text = [](const Json::Value& chain, const char* key) {
        return chain[key].isString() ? chain[key].asString() : std::string();
    };
    for (const Json::Value& entry : root["nftables"]) {
        if (!entry.isObject() || !entry["chain"].isObject()) {
            continue;
        }
        const Json::Value& chain = entry["chain"];
        const std::string table = text(chain, "family") + " " + text(chain, "table");
        if (table != "inet velt_fileserv" && text(chain, "hook") == "input" &&
            text(chain, "policy") == "drop") {
            found.push_back(table + " " + text(chain, "name"));
        }
    }
    return found;
}

} // namespace velt
