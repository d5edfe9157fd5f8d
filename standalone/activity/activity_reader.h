// Takes over what sessions write down, stores it, and tells who listens.
#ifndef VELT_STANDALONE_ACTIVITY_ACTIVITY_READER_H
#define VELT_STANDALONE_ACTIVITY_ACTIVITY_READER_H

#include "base/result.h"
#include "standalone/activity/operation_record.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <utility>

namespace velt {

/// Starts the thread that takes records over. Those that were written before are taken, too. To be called
/// once the state root is chosen. A second call does nothing. What it cannot do it tries again, and
/// activityProblem tells.
void startActivityReader();

/// Ends the thread when it has finished what it is at; nothing is lost. Does nothing when none runs.
void stopActivityReader();

enum class ActivityKind {
    operation,        ///< a record, also of a session opened or closed or a login refused
    transferStarted,  ///< of a running transfer: `record` has what is known by now,
    transferProgress, ///< at most once a second for each transfer
};

struct Activity {
    ActivityKind kind = ActivityKind::operation;
    OperationRecord record; ///< of a running transfer: octets and duration so far, result incomplete
    std::uint64_t rate = 0; ///< of a running transfer, octets in the last second
};

using ActivitySubscriber = std::function<void(const Activity&)>;
using ActivitySubscription = std::uint64_t; ///< never 0

/// Calls the subscriber with all that happens from now on, on the reader's thread, some tenths of a second
/// after it happened. What the subscriber takes holds up the reader, so it hands things on and returns. What
/// it throws is dropped.
ActivitySubscription subscribeActivity(ActivitySubscriber subscriber);

/// When it returns, the subscriber is not running and is not called again. Not to be called by a subscriber.
void unsubscribeActivity(ActivitySubscription subscription);

/// Octets in both directions, as the server sees them.
struct MovedOctets {
    std::uint64_t in = 0;  ///< uploaded
    std::uint64_t out = 0; ///< downloaded
};

/// Since the reader was started. Numbers never become less, but `sessions`, which are those of now.
struct ActivityTotals {
    std::map<SessionProtocol, std::uint64_t> sessions;
    std::map<SessionProtocol, MovedOctets> octets; ///< of running transfers, too, with the last second's
    /// By protocol and outcome: "accepted", "password", "configuration", "banned", "limit", "other".
    std::map<std::pair<SessionProtocol, std::string>, std::uint64_t> logins;
    std::uint64_t records = 0; ///< taken over
    std::uint64_t damaged = 0; ///< lines that sessions wrote and that were no records
};

ActivityTotals activityTotals();

/// How many records could not be written since the machine began: a full disk, as a rule. 0 when that cannot
/// be told.
std::uint64_t lostRecords();

/// When the last of them was; nothing when there are none.
std::optional<std::chrono::system_clock::time_point> lastLostRecord();

/// Why the reader cannot take over at this moment, in a sentence; "" when it can.
std::string activityProblem();

/// Why the last records did not go into the log for other programs, in a sentence; "" when they did.
std::string transferLogProblem();

} // namespace velt

#endif
