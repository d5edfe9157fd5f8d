#include "standalone/control/systemd_unit.h"

#include "standalone/core/installed_files.h"

#include <array>
#include <cstdio>
#include <sstream>

namespace velt {

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

// Not the daemon itself: SFTP sessions register with the login manager, which moves them out of the unit's
// control group, so once their listener is gone only their ancestry shows whose they are.
std::string renderUnit(const std::string& daemon, const std::filesystem::path& directory) {
    std::ostringstream text;
    text << "[Unit]\n"
         << "Description=VELT " << (daemon == "sftp" ? "SFTP" : "FTP") << " server\n"
         << "After=network.target\n"
         // An administrator who changes settings often is no loop of crashes.
         << "StartLimitIntervalSec=0\n"
         << "\n[Service]\n"
         << "Type=notify\n"
         << "ExecStart=" << quoteUnitWord(installedFile("velt-supervise").string()) << ' '
         << quoteUnitWord(directory.string()) << ' ' << quoteUnitWord(daemon)
         << '\n'
         // A supervisor that was killed comes back, one that says that its daemon does not start is not asked
         // again. It starts the daemon anew itself.
         << "Restart=on-abnormal\n"
         << "RestartSec=100ms\n"
         // The supervisor ends what it started, and its successor what is left of a killed one.
         << "KillMode=process\n"
         << "TimeoutStartSec=10s\n"
         << "TimeoutStopSec=5s\n"
         // One session too large for the machine's memory is no reason to end the others.
         << "OOMPolicy=continue\n";
    return text.str();
}

std::vector<UnitFile> unitFiles(const std::string& daemon, const std::filesystem::path& directory) {
    std::vector<UnitFile> files{{unitName(daemon), renderUnit(daemon, directory)}};
    if (daemon == "sftp") {
        // /run/sshd is that unit's, and gone when it is stopped; but each of our connections needs it, too.
        files.push_back({"ssh.service.d/velt-sftp.conf", "[Service]\nRuntimeDirectoryPreserve=yes\n"});
    }
    return files;
}

} // namespace velt
