// Changing which services confine their users.
#ifndef VELT_STANDALONE_CONTROL_CHANGE_CONFINEMENT_H
#define VELT_STANDALONE_CONTROL_CHANGE_CONFINEMENT_H

#include "base/result.h"
#include "standalone/settings/confinement_settings.h"

namespace velt {

/// Stores the settings, and makes a service that runs follow them. Where SFTP is on, its daemon's own test
/// must take them. After an error nothing is stored.
Result<> changeConfinement(const ConfinementSettings& settings);

} // namespace velt

#endif
