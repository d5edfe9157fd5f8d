// The units that we generate for systemd.
#ifndef VELT_STANDALONE_CONTROL_SYSTEMD_UNIT_H
#define VELT_STANDALONE_CONTROL_SYSTEMD_UNIT_H

#include "standalone/daemons/daemon.h"

#include <filesystem>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// "velt-ftpd.service" for the daemon "ftpd".
std::string unitName(const Daemon& daemon);

/// The text of the unit that runs the daemon's supervisor, which finds what to start in the folder.
std::string renderUnit(const Daemon& daemon, const std::filesystem::path& folder);

struct UnitFile {
    std::filesystem::path name; ///< below the folder of units
    std::string text;
};

/// All that systemd is given for the daemon.
std::vector<UnitFile> unitFiles(const Daemon& daemon, const std::filesystem::path& folder);

/// One argument as a word of ExecStart=, safe against every meaning that systemd gives to characters.
std::string quoteUnitWord(std::string_view argument);

} // namespace velt

#endif
