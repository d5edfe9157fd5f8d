// From what was staged to what is done, step by step.
#ifndef VELT_STANDALONE_CHANGE_CHANGE_PROGRAM_H
#define VELT_STANDALONE_CHANGE_CHANGE_PROGRAM_H

#include "ftp/ftp_library.h"
#include "standalone/change/daemon_requests.h"
#include "standalone/change/settings_change.h"
#include "standalone/core/staged_files.h"
#include "standalone/daemons/daemon.h"
#include "standalone/journal/held_journal.h"

#include <functional>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace velt {

/// A port of a service that is on, or the range of its sessions.
using OpenPorts = std::vector<VELT_FTP_PORT_RANGE>;

/// All that a change asks for.
struct StagedRequest {
    std::vector<StagedFile> files;
    std::vector<DaemonRequests::Wish> wishes;
    std::vector<std::string> madeByStarts; ///< files that a start makes where they are missing
    bool firewall = false;                 ///< it was to be loaded
    OpenPorts openBefore;
    OpenPorts openAfter;
    std::vector<HeldJournal::Item> journal;
    SessionPolicy policy = SessionPolicy::byChange;
    std::set<const Daemon*> losingRights; ///< whose sessions may do what the settings or the rules now forbid
};

/// A step, and how it is done.
struct ProgramStep {
    std::optional<ChangeStep> step; ///< none where nothing is to be seen of it
    std::function<Result<int>()>
        act{};             ///< gives the sessions that it ended; empty: it comes with another step
    int sessionsEnded = 0; ///< as it looks now
};

/// "ftp settings"; "run key of ftpd" for one below the folder of run keys.
std::string subjectOf(const StagedFile& file);

/// The steps in order, as things stand now.
std::vector<ProgramStep> programOf(const StagedRequest& request);

/// The ports of what the stored, or this thread's staged, settings switch on.
Result<OpenPorts> openPorts();

} // namespace velt

#endif
