#include "standalone/firewall/firewall_settings.h"

#include "base/file.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/ports/port_range.h"

#include <array>
#include <cerrno>
#include <cstring>
#include <set>
#include <sstream>
#include <utility>

namespace velt {
namespace {

constexpr std::array<std::pair<std::string_view, FirewallMode>, 3> modes{{
    {"off", FirewallMode::off},
    {"accept", FirewallMode::accept},
    {"drop", FirewallMode::drop},
}};

std::string trimmed(const std::string& text) {
    constexpr const char* blanks = " \t\r";
    const auto first = text.find_first_not_of(blanks);
    return first == std::string::npos ? "" : text.substr(first, text.find_last_not_of(blanks) - first + 1);
}

class Parser {
public:
    /// What is wrong with the line, as the end of a sentence; "" when it was taken.
    std::string take(const std::string& line) {
        const auto equals = line.find('=');
        const std::string key = trimmed(line.substr(0, equals));
        if (equals == std::string::npos || key.empty()) {
            return "this is no line of the form \"key = value\"";
        }
        if (!seen_.insert(key).second) {
            return "the key " + key + " stands there a second time";
        }
        const std::string value = trimmed(line.substr(equals + 1));
        if (key == "version") {
            return value == "1" ? "" : "version \"" + value + "\" is not known here";
        }
        if (key == "mode") {
            return takeMode(value);
        }
        return key == "ports" ? takePorts(value) : "the key " + key + " is not known";
    }

    bool hasVersion() const { return seen_.count("version") > 0; }
    const FirewallSettings& settings() const { return settings_; }

private:
    std::string takeMode(const std::string& value) {
        for (const auto& [name, mode] : modes) {
            if (name == value) {
                settings_.mode = mode;
                return "";
            }
        }
        return "the mode is none of off, accept and drop";
    }

    std::string takePorts(const std::string& value) {
        std::istringstream words(value);
        for (std::string word; words >> word;) {
            const auto range = parsePortRange(word);
            if (!range) {
                return "\"" + word + "\" is neither a port nor a range of ports";
            }
            settings_.furtherPorts.push_back(*range);
        }
        return "";
    }

    std::set<std::string> seen_;
    FirewallSettings settings_;
};

} // namespace

std::optional<FirewallSettings> parseFirewallSettings(std::string_view text, const std::string& file) {
    Parser parser;
    int number = 0;
    std::string problem;
    std::istringstream lines{std::string(text)};
    for (std::string line; problem.empty() && std::getline(lines, line);) {
        ++number;
        line = trimmed(line.substr(0, line.find('#')));
        problem = line.empty() ? "" : parser.take(line);
    }
    std::string place = "Settings file " + file;
    if (!problem.empty()) {
        place += ", line " + std::to_string(number);
    } else if (!parser.hasVersion()) {
        problem = "the key version is missing";
    } else {
        return parser.settings();
    }
    fail(ErrorNumber::damaged, place + ": " + problem + ".");
    return std::nullopt;
}

std::optional<FirewallSettings> loadFirewallSettings() {
    const std::filesystem::path file = statePath(paths::firewallSettings);
    const auto text = readOptionalFile(file);
    if (!text) {
        fail(text.error());
        return std::nullopt;
    }
    return *text ? parseFirewallSettings(**text, file.string()) : FirewallSettings{};
}

} // namespace velt
