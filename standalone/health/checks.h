// The checks that make up the judgement, each for itself. All are thread-safe.
#ifndef VELT_STANDALONE_HEALTH_CHECKS_H
#define VELT_STANDALONE_HEALTH_CHECKS_H

#include "standalone/health/finding.h"

#include <chrono>

namespace velt {

using TimePoint = std::chrono::system_clock::time_point;

/// Enabled services that are down or run with former settings, with the reason.
Findings serviceFindings();

/// Services that run with something else than what is stored, or that could not be started again with it.
/// What changes meanwhile is not judged.
Findings settingsInForceFindings();

/// The ids of these findings.
inline constexpr std::string_view settingsNotInForce = "settings-not-in-force";
inline constexpr std::string_view nextStartFails = "next-start-fails";

/// Files of this system that a service which is on needs, and that are missing or cannot be used.
Findings programFindings();

/// Files of settings that cannot be read, or have values that no daemon takes. Those of a service that cannot
/// be read at all are in serviceFindings.
Findings settingsFileFindings();

/// The share that anonymous users are confined to, where it keeps all of them out.
Findings anonymousFindings();

/// A change that failed and could not be taken back, or not wholly.
Findings changeFindings();

/// An administrator log that cannot be used; changes that nobody confirmed and that are in force
/// nevertheless.
Findings journalFindings(TimePoint now);

/// What sessions did and nobody can look up: records that were lost, that cannot be taken over, or that were
/// removed before their age.
Findings activityFindings(TimePoint now);

/// Services that run, and do not greet or take up TLS as their clients expect, or serve a certificate other
/// than the stored one.
Findings greetingFindings();

/// Daemons and supervisors of ours, and this program, that run from files which have been replaced since.
Findings replacedProgramFindings();

/// The certificate of FTPS: whether it fits its key, and when it is valid. Nothing while FTPS is off.
Findings certificateFindings(TimePoint now);

/// SFTP that is on and not confined.
Findings confinementFindings();

/// The files of the shares and of the chroot rules, and the accounts that they name.
Findings fileFindings();

/// Files of users' public keys that cannot be used, and keys of accounts that are gone.
Findings keyFindings();

/// Chroot rules for folders of shares that do not exist.
Findings ruleShareFindings();

/// Whether the packet filter has the rules that the settings ask for, and whether they are of use.
Findings firewallFindings();

/// Who listens in the passive range, and whether it is too small beside the kernel's own.
Findings passiveRangeFindings();

/// Whether the stored external address can be reached by anybody.
Findings externalAddressFindings();

/// The room that is left below the state root.
Findings diskFindings();

/// Folders of the state that nobody can write, since their disk is mounted for reading only.
Findings readOnlyFindings();

/// A clock that is behind the files of this system.
Findings clockFindings(TimePoint now);

} // namespace velt

#endif
