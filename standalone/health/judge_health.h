// The one judgement of this server's health.
#ifndef VELT_STANDALONE_HEALTH_JUDGE_HEALTH_H
#define VELT_STANDALONE_HEALTH_JUDGE_HEALTH_H

#include "standalone/health/finding.h"

namespace velt {

/// Everything that is found wrong now, the gravest first. It connects to the services as a client would, asks
/// the packet filter and reads files, and changes nothing; a service that has greeted is asked again after a
/// minute, or when its process, port or certificate is another. Takes some seconds at most, even where a
/// service hangs. What this process has no right to see is left out. Thread-safe; leaves the last error
/// alone.
Findings judgeHealth();

/// What the stored settings make wrong by themselves, or those that this thread has staged: those findings of
/// judgeHealth that tell of the passive range, the external address and the shares of rules. Takes some
/// milliseconds. Thread-safe.
Findings judgeSettings();

} // namespace velt

#endif
