// The units that we generate for systemd.
#ifndef VELT_STANDALONE_SERVICES_SYSTEMD_UNIT_H
#define VELT_STANDALONE_SERVICES_SYSTEMD_UNIT_H

#include "standalone/daemon_plan.h"

#include <string>
#include <string_view>

namespace velt {

/// "velt-ftpd.service" for the daemon "ftpd".
std::string unitName(const std::string& daemon);

/// The unit's text. It also carries the plan's configuration hash and ports, in a section that systemd leaves
/// alone.
std::string renderUnit(const std::string& daemon, const DaemonPlan& plan);

/// What a unit's text says about the plan that it was made from; the arguments stay empty.
DaemonPlan readUnit(std::string_view text);

/// One argument as a word of ExecStart=, safe against every meaning that systemd gives to characters.
std::string quoteUnitWord(std::string_view argument);

} // namespace velt

#endif
