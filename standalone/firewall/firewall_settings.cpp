#include "standalone/firewall/firewall_settings.h"

#include "standalone/core/file_store.h"
#include "standalone/core/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/ports/port_range.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <sstream>

namespace velt {
namespace {

constexpr std::string_view versionLine = "version 1";

/// What is wrong with the line, as the end of a sentence; "" when it was taken.
std::string takeLine(const std::string& line, FirewallSettings& settings) {
    std::istringstream words(line);
    std::string key;
    words >> key;
    if (key == "mode") {
        std::string mode;
        std::string rest;
        words >> mode;
        if (words >> rest || (mode != "off" && mode != "accept" && mode != "drop")) {
            return "the mode is none of off, accept and drop";
        }
        settings.mode = mode == "off"      ? FirewallMode::off
                        : mode == "accept" ? FirewallMode::accept
                                           : FirewallMode::drop;
        return "";
    }
    if (key != "ports") {
        return "the key \"" + key + "\" is unknown";
    }
    for (std::string word; words >> word;) {
        const auto range = parsePortRange(word);
        if (!range) {
            return "\"" + word + "\" is neither a port nor a range of ports";
        }
        settings.furtherPorts.push_back(*range);
    }
    return "";
}

} // namespace

std::optional<FirewallSettings> parseFirewallSettings(std::string_view text, const std::string& file) {
    FirewallSettings settings;
    bool versionSeen = false;
    int number = 0;
    const auto damaged = [&](const std::string& what) {
        fail(ErrorNumber::damaged, file + ", line " + std::to_string(number) + ": " + what + ".");
        return std::nullopt;
    };
    std::istringstream lines{std::string(text)};
    for (std::string line; std::getline(lines, line);) {
        ++number;
        line.erase(std::min(line.find('#'), line.size()));
        line.erase(line.find_last_not_of(" \t\r") + 1);
        if (line.empty()) {
            continue;
        }
        if (!versionSeen) {
            if (line != versionLine) {
                return damaged("the file does not begin with \"" + std::string(versionLine) + "\"");
            }
            versionSeen = true;
            continue;
        }
        const std::string problem = takeLine(line, settings);
        if (!problem.empty()) {
            return damaged(problem);
        }
    }
    if (!versionSeen) {
        number = 1;
        return damaged("the file does not begin with \"" + std::string(versionLine) + "\"");
    }
    return settings;
}

std::optional<FirewallSettings> loadFirewallSettings() {
    const std::filesystem::path file = statePath("/etc/velt/firewall.conf");
    errno = 0;
    const auto text = readFile(file);
    if (text) {
        return parseFirewallSettings(*text, file.string());
    }
    if (errno != ENOENT) {
        fail(ErrorNumber::store, file.string() + " cannot be read: " + std::strerror(errno) + ".");
        return std::nullopt;
    }
    return FirewallSettings{};
}

} // namespace velt
