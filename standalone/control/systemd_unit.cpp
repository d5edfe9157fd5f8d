#include "standalone/control/systemd_unit.h"

#include "base/text.h"
#include "standalone/core/installed_files.h"

#include <array>
#include <cstdio>
#include <sstream>

namespace velt {

namespace {

// What neither the daemons nor their sessions need. Sessions work anywhere in homes and shares, which may lie
// anywhere, and log in by what the machine has: its modules for PAM and for accounts run in the daemons and
// may make homes (CAP_CHOWN, CAP_DAC_OVERRIDE, CAP_FOWNER, CAP_FSETID) or mount them, limit resources
// (CAP_SYS_NICE, CAP_SYS_RESOURCE), or write to the audit log. So these stay as they are on the machine:
// - its files, for writing where modes allow it (ProtectSystem=, ProtectHome=, PrivateTmp=);
// - set-group-id folders (RestrictSUIDSGID=, which refuses openat2 as well, as the view of a login needs it;
//   over FTP our module keeps such bits from everybody);
// - code that is made at run time, as some modules do (MemoryDenyWriteExecute=);
// - the right to mount, for the views of sessions (CAP_SYS_ADMIN, @mount);
// - the right to look at the listening sockets of a daemon that gives way to its successor (pidfd_getfd and
//   CAP_SYS_PTRACE), for the supervisor;
// - the right to change the firewall, for the supervisor, which has it refuse who fails to log in too often
//   (CAP_NET_ADMIN).
constexpr std::string_view restrictions =
    "CapabilityBoundingSet=CAP_AUDIT_WRITE CAP_CHOWN CAP_DAC_OVERRIDE CAP_DAC_READ_SEARCH CAP_FOWNER "
    "CAP_FSETID CAP_KILL CAP_NET_ADMIN CAP_NET_BIND_SERVICE CAP_SETGID CAP_SETUID CAP_SYS_ADMIN "
    "CAP_SYS_CHROOT CAP_SYS_NICE CAP_SYS_PTRACE CAP_SYS_RESOURCE\n"
    "NoNewPrivileges=yes\n"
    "SystemCallFilter=~@clock @cpu-emulation @debug @module @obsolete @raw-io @reboot @swap\n"
    "SystemCallFilter=pidfd_getfd\n"
    "SystemCallErrorNumber=EPERM\n"
    "SystemCallArchitectures=native\n"
    "PrivateDevices=yes\n"
    "ProtectClock=yes\n"
    "ProtectControlGroups=yes\n"
    "ProtectHostname=yes\n"
    "ProtectKernelLogs=yes\n"
    "ProtectKernelModules=yes\n"
    "ProtectKernelTunables=yes\n"
    "RestrictAddressFamilies=AF_UNIX AF_INET AF_INET6 AF_NETLINK\n"
    "RestrictNamespaces=mnt\n"
    "RestrictRealtime=yes\n"
    "LockPersonality=yes\n";

} // namespace

std::string unitName(const Daemon& daemon) {
    return "velt-" + std::string(daemon.name) + ".service";
}

std::string quoteUnitWord(std::string_view argument) {
    std::string word = "\"";
    for (const char character : argument) {
        if (character == '"' || character == '\\') {
            word += '\\';
            word += character;
        } else if (character == '%' || character == '$') {
            word.append(2, character); // no specifier, no variable
        } else if (isControl(character)) {
            std::array<char, 5> escape{};
            std::snprintf(escape.data(), escape.size(), "\\x%02x", static_cast<unsigned>(character));
            word += escape.data();
        } else {
            word += character;
        }
    }
    return word + '"';
}

// Not the daemon itself: SFTP sessions register with the login manager, which moves them out of the unit's
// control group, so once their listener is gone only their ancestry shows whose they are.
std::string renderUnit(const Daemon& daemon, const std::filesystem::path& folder) {
    std::ostringstream text;
    text << "[Unit]\n"
         << "Description=VELT " << daemon.label << " server\n"
         << "After=network.target\n"
         // An administrator who changes settings often must not be taken for a loop of crashes.
         << "StartLimitIntervalSec=0\n"
         << "\n[Service]\n"
         << "Type=notify\n"
         << "ExecStart=" << quoteUnitWord(installedFile("velt-supervise").string()) << ' '
         << quoteUnitWord(folder.string()) << ' ' << quoteUnitWord(daemon.name)
         << '\n'
         // A supervisor that was killed comes back, one that says that its daemon does not start is not asked
         // again. It starts the daemon again itself.
         << "Restart=on-abnormal\n"
         << "RestartSec=100ms\n"
         // The supervisor ends what it started, and its successor what is left of a killed one.
         << "KillMode=process\n"
         << "TimeoutStartSec=10s\n"
         << "TimeoutStopSec=5s\n"
         // A session too large for the machine's memory must not end the others.
         << "OOMPolicy=continue\n"
         << restrictions;
    return text.str();
}

std::vector<UnitFile> unitFiles(const Daemon& daemon, const std::filesystem::path& folder) {
    std::vector<UnitFile> files{{unitName(daemon), renderUnit(daemon, folder)}};
    for (const UnitDropIn& dropIn : daemon.dropIns) {
        files.push_back({dropIn.file, std::string(dropIn.text)});
    }
    return files;
}

} // namespace velt
