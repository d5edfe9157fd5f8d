// What the platform library offers the program that loads the module over it, beside the contract.
//
// A host, at its start: openState, the subscriptions, startEnabledServices, watchServices. Then, for each
// request, on the thread that serves it: setRequestActor, clearLastError, the module's entry function, and
// after a failure lastErrorSentence or lastPortConflict for the answer. A change that was accepted is in
// force when servicesDown is empty after it.
//
// Functions with an int result return a negative one on failure, with the last error set. Unless it says
// otherwise a function may be called from any thread.
#ifndef VELT_STANDALONE_STANDALONE_H
#define VELT_STANDALONE_STANDALONE_H

#include "standalone/core/effects.h"
#include "standalone/core/last_error.h"

#include <array>
#include <chrono>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace velt {

/// Chooses the root folder of all stored state ("/" in production), and writes the default settings where
/// there are none yet: both services off. Settings that are there already stay, also when they are damaged;
/// whoever reads those is told. To be called once, before any other operation of the library and while the
/// process has one thread only.
int openState(const std::filesystem::path& root);

/// Makes the daemons follow the stored settings after a boot: starts what is enabled. Blocks until each
/// daemon accepts connections or has failed. One that fails does not keep the others from starting; the
/// result is then negative.
int startEnabledServices();

/// Looks, twice a second and on a thread of its own, whether the supervisors of the daemons live, and starts
/// what lost its supervisor again with the stored settings (ended, where these have switched it off): its
/// sessions are cut. A supervisor brings back a daemon that dies; killed itself, it cannot, and its daemon's
/// words go nowhere. Where systemd keeps the supervisors, it does this alone. A second call does nothing. No
/// process may fork a child that goes on with this library while it watches.
int watchServices();

/// Ends the watch, if there is one, and waits for what it does at the moment. To be called before the process
/// ends.
void unwatchServices();

/// A service that the stored settings enable and that does not follow them.
struct ServiceDown {
    std::string service; ///< "ftp" (FTP and FTPS, one daemon) or "sftp"
    std::string reason;  ///< a sentence: the daemon's own words of its last start, where it had some
    bool servesFormerSettings = false; ///< it runs, with the settings that it had before the stored ones
    bool operator==(const ServiceDown&) const = default;
};

/// The enabled services that are down, or serve former settings since a restart with the stored ones was
/// refused: empty when all is well. startEnabledServices tries them once more. A service whose settings
/// cannot be read is listed, since nobody can tell that it is off. It is the state of this moment: between
/// the stop and the start of a change that somebody else makes, a service is down as well. Leaves the last
/// error alone.
std::vector<ServiceDown> servicesDown();

/// How often the daemon behind the service ("ftpd", "sftp") was started again after it had ended by itself,
/// since its supervisor, or the machine, began. 0 for one that is off, and for an unknown name.
std::uint64_t daemonRestarts(const std::string& service);

/// Names who makes the request that this thread serves now, and the address it came from, for the entries of
/// the administrator log. Holds for this thread until the next call; two empty texts: the system itself.
void setRequestActor(const std::string& actor, const std::string& address);

/// A system event, as it was announced.
struct SystemEvent {
    std::chrono::system_clock::time_point time;
    std::string name; ///< "velt.service.action"
    std::map<std::string, std::string> parameters;
    std::string actor; ///< "" for the system itself
    std::string address;
};

/// An entry of the administrator log, as it was written.
struct LogEntry {
    std::int64_t id = 0;                        ///< grows with each entry; none is used twice
    std::chrono::system_clock::time_point time; ///< in whole milliseconds
    int category = 0;
    int level = 0;
    unsigned event = 0;               ///< 0x11B000nn
    std::array<std::string, 4> texts; ///< "" for those that the event does not use
    std::string sentence;             ///< the event's sentence with the texts filled in
    std::string actor;                ///< "" for the system itself
    std::string address;
};

using EventSubscriber = std::function<void(const SystemEvent&)>;
using LogSubscriber = std::function<void(const LogEntry&)>;
using Subscription = std::uint64_t; ///< never 0

/// Calls the subscriber with every event (log entry) from now on, on the thread that raised it, after it has
/// been written down. What the subscriber takes is added to the request's time, so it hands the event on and
/// returns. It may be called by several threads at once; what it throws is dropped.
Subscription subscribeEvents(EventSubscriber subscriber);
Subscription subscribeLog(LogSubscriber subscriber);

/// Ends a subscription of either kind. When it returns, the subscriber is not running and is not called
/// again; a subscriber must not end its own subscription. An unknown one is ignored.
void unsubscribe(Subscription subscription);

/// Which entries of the administrator log are wanted; what is not set does not narrow.
struct LogFilter {
    std::optional<std::chrono::system_clock::time_point> since; ///< of this moment or later
    std::optional<unsigned> event;
    std::optional<std::string> actor;     ///< exactly this text
    std::optional<std::int64_t> beforeId; ///< older than this entry: the last id of a page leads to the next
    int limit = 100;                      ///< 1 to 1000
};

/// The newest entries that the filter lets through, newest first. Nothing, with the last error set, when the
/// log cannot be read.
std::optional<std::vector<LogEntry>> queryLog(const LogFilter& filter);

/// Who holds a port.
struct PortConflict {
    int port = 0;       ///< 0: there was no conflict
    std::string holder; ///< in words: "the SFTP service", "nginx (process 812)"
};

/// What the calling thread's last WebUtils::IsPortConflict found.
PortConflict lastPortConflict();

// The calling thread's last error in a sentence: lastErrorSentence, clearLastError
// (standalone/core/last_error.h). Listing effects instead of doing them, or failing them: setEffectHook;
// hearing which were done, with what result and in what time: setEffectReport (standalone/core/effects.h).
// Undoing is not in here: a host that wants it keeps what was before, and sets that again.

} // namespace velt

#endif
