#include "standalone/services/systemd_unit.h"

#include "standalone/ports/port_range.h"

#include <array>
#include <cstdio>
#include <sstream>

namespace velt {
namespace {

constexpr std::string_view hashKey = "Configuration=";
constexpr std::string_view portKey = "Port=";

} // namespace

std::string unitName(const std::string& daemon) {
    return "velt-" + daemon + ".service";
}

std::string quoteUnitWord(std::string_view argument) {
    std::string word = "\"";
    for (const char character : argument) {
        const auto byte = static_cast<unsigned char>(character);
        if (character == '"' || character == '\\') {
            word += '\\';
            word += character;
        } else if (character == '%' || character == '$') {
            word.append(2, character); // no specifier, no variable
        } else if (byte < 0x20 || byte == 0x7f) {
            std::array<char, 5> escape{};
            std::snprintf(escape.data(), escape.size(), "\\x%02x", static_cast<unsigned>(byte));
            word += escape.data();
        } else {
            word += character;
        }
    }
    return word + '"';
}

std::string renderUnit(const std::string& daemon, const DaemonPlan& plan) {
    std::ostringstream text;
    text << "[Unit]\n"
         << "Description=VELT " << (daemon == "sftp" ? "SFTP" : "FTP") << " server\n"
         << "After=network.target\n"
         << "StartLimitIntervalSec=0\n"
         << "\n[Service]\n"
         << "Type=exec\n"
         << "ExecStart=";
    const char* separator = "";
    for (const std::string& argument : plan.arguments) {
        text << separator << quoteUnitWord(argument);
        separator = " ";
    }
    text << "\nRestart=always\n"
         << "RestartSec=500ms\n"
         << "TimeoutStopSec=2s\n"
         // The sessions of SFTP outlive a pause; those of FTP end with their server.
         << "KillMode=" << (daemon == "sftp" ? "process" : "control-group") << "\n"
         << "\n[X-Velt]\n"
         << hashKey << plan.configurationHash << '\n';
    for (const int port : plan.listenPorts) {
        text << portKey << port << '\n';
    }
    return text.str();
}

DaemonPlan readUnit(std::string_view text) {
    DaemonPlan plan;
    std::istringstream lines{std::string(text)};
    for (std::string line; std::getline(lines, line);) {
        if (line.starts_with(hashKey)) {
            plan.configurationHash = line.substr(hashKey.size());
        } else if (line.starts_with(portKey)) {
            if (const auto port = parsePortRange(std::string_view(line).substr(portKey.size())))
                plan.listenPorts.push_back(port->first);
        }
    }
    return plan;
}

} // namespace velt
