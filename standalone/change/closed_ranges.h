// Passive ports of FTP that a change closes to sessions which go on.
#ifndef VELT_STANDALONE_CHANGE_CLOSED_RANGES_H
#define VELT_STANDALONE_CHANGE_CLOSED_RANGES_H

#include "standalone/change/change_program.h"

#include <string>
#include <vector>

namespace velt {

/// Whether a port is closed to everybody as long as our rules do not open it. Settings that cannot be read
/// tell nothing of the rules in force, so then it may be.
bool rulesCloseOthers();

/// What to tell of open FTP sessions that keep a passive range which the firewall closes: they began with it,
/// and their next transfers fail. As things stand now, before the change.
std::vector<std::string> closedRangeWarnings(const StagedRequest& request,
                                             const std::vector<ProgramStep>& program);

} // namespace velt

#endif
