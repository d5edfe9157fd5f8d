#include "standalone/firewall/table_reading.h"

#include "base/json_text.h"
#include "base/sha256.h"

#include <algorithm>

namespace velt {
namespace {

std::optional<VELT_FTP_PORT_RANGE> readElement(const Json::Value& element) {
    if (element.isInt()) {
        return VELT_FTP_PORT_RANGE{element.asInt(), element.asInt()};
    }
    const Json::Value range = element.isObject() ? element["range"] : Json::Value();
    if (range.isArray() && range.size() == 2 && range[0].isInt() && range[1].isInt()) {
        return VELT_FTP_PORT_RANGE{range[0].asInt(), range[1].asInt()};
    }
    return std::nullopt;
}

bool isNamed(const Json::Value& entry, const char* kind, const char* name) {
    return entry.isObject() && entry[kind].isObject() && entry[kind]["name"] == name;
}

/// Numbers that the kernel gives to each thing anew.
void removeHandles(Json::Value& value) {
    if (value.isObject()) {
        value.removeMember("handle");
    }
    if (value.isObject() || value.isArray()) {
        for (Json::Value& each : value) {
            removeHandles(each);
        }
    }
}

} // namespace

std::string tablePrint(std::string_view tableAsJson) {
    Json::Value root = parseJson(tableAsJson).valueOr({});
    if (!root.isObject() || !root["nftables"].isArray()) {
        return "";
    }
    for (Json::Value& entry : root["nftables"]) {
        if (isNamed(entry, "set", "banned4") || isNamed(entry, "set", "banned6")) {
            entry["set"].removeMember("elem");
        }
    }
    removeHandles(root);
    return sha256(jsonText(root));
}

std::optional<TableInForce> readTable(std::string_view tableAsJson) {
    const Json::Value root = parseJson(tableAsJson).valueOr({});
    if (!root.isObject() || !root["nftables"].isArray()) {
        return std::nullopt;
    }
    TableInForce table;
    bool hasChain = false;
    for (const Json::Value& entry : root["nftables"]) {
        if (isNamed(entry, "chain", "input")) {
            hasChain = true;
            table.drops = entry["chain"]["policy"] == "drop";
        } else if (isNamed(entry, "set", "tcp_open") && entry["set"]["elem"].isArray()) {
            for (const Json::Value& element : entry["set"]["elem"]) {
                if (const auto range = readElement(element)) {
                    table.openPorts.push_back(*range);
                }
            }
        }
    }
    table.openPorts = joinedRanges(std::move(table.openPorts));
    return hasChain ? std::optional(table) : std::nullopt;
}

std::vector<VELT_FTP_PORT_RANGE> joinedRanges(std::vector<VELT_FTP_PORT_RANGE> ranges) {
    std::ranges::sort(ranges, {}, &VELT_FTP_PORT_RANGE::first);
    std::vector<VELT_FTP_PORT_RANGE> joined;
    for (const VELT_FTP_PORT_RANGE& range : ranges) {
        if (!joined.empty() && range.first <= joined.back().last + 1) {
            joined.back().last = std::max(joined.back().last, range.last);
        } else {
            joined.push_back(range);
        }
    }
    return joined;
}

} // namespace velt
