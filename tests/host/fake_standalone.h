// What the platform library offers a host, over the fake platform.
#ifndef VELT_TESTS_HOST_FAKE_STANDALONE_H
#define VELT_TESTS_HOST_FAKE_STANDALONE_H

#include "standalone/standalone.h"

#include <cstdint>
#include <map>
#include <string>
#include <vector>

/// What a test sets up and looks at, while no request runs.
struct FakeStandalone {
    velt::EventSubscriber eventSubscriber;
    velt::LogSubscriber logSubscriber;
    std::vector<velt::LogEntry> log;                   ///< oldest first
    int largestLimit = 0;                              ///< that the log was asked for
    bool logFails = false;                             ///< with `sentence`
    std::string sentence;                              ///< of the last error of the requests to come
    velt::PortConflict conflict;                       ///< that is found
    velt::ErrorNumber error = velt::ErrorNumber::none; ///< the kind of the last error
    bool planFails = false;                            ///< with commitError, as commits do
    /// The next changes fail, also those that are under way on another thread.
    void failCommits(const std::string& why);
    /// The same for bans.
    void setBans(std::vector<velt::Ban> theirs);

    bool commitFails = false; ///< of the next changes, with `sentence`
    velt::ErrorNumber commitError = velt::ErrorNumber::daemon;
    bool undone = true;                      ///< what was done of a change that failed
    std::vector<std::string> warnings;       ///< of each change that is done
    velt::IntendedPorts intended;            ///< of the last change
    std::vector<velt::ChangeRecord> history; ///< oldest first
    std::int64_t lastChange = 0;             ///< its id
    bool keepsRemovedChanges = false;        ///< as if they could not be removed
    std::vector<std::string> askedRestarts;  ///< "SERVICE POLICY" of each that was asked for
    bool restartFails = false;               ///< with `sentence`
    bool historyFails = false;               ///< with `sentence`
    std::vector<std::string> audit;          ///< the texts of the host's own log entries: "WAY: WHAT"
    bool settingsFail = false;               ///< those of the services cannot be read
    std::vector<velt::ServiceDown> down;     ///< services that are switched on and do not run
    bool startHelps = false;                 ///< and run once they are started
    int starts = 0;                          ///< how often the host started what is switched on
    std::map<std::string, std::uint64_t> restarts;
    velt::Findings findings;                     ///< of the judgements to come
    int judgements = 0;                          ///< how many were made
    std::function<void()> whileJudged;           ///< called by each
    int watchHolds = 0;                          ///< how many hold the watch of the services back now
    int watchHeld = 0;                           ///< and how often that was done
    std::vector<velt::ServiceSessions> sessions; ///< what each request did to them
    std::vector<velt::Ban> bans;
    bool bansFail = false;                 ///< with `sentence`
    std::vector<std::string> failedLogins; ///< "SERVICE ADDRESS"
    std::function<void()> whileNoted;      ///< called for each of them before
    std::string accessReport;              ///< unless `error` is set
    std::string askedAccess;               ///< "USER PATH", the last one
    std::vector<velt::StoredKey> keys;
    bool keysFail = false; ///< with `error` and `sentence`
    std::vector<velt::OpenSession> openSessions;
    bool sessionsFail = false;                     ///< they cannot be listed: with `sentence`
    std::vector<std::string> immortal;             ///< the ids of those that cannot be ended: with `sentence`
    std::vector<std::string> endedSessions;        ///< "ID BY REASON"
    std::vector<velt::OperationRecord> operations; ///< newest first
    velt::OperationFilter askedOperations;         ///< the last one
    velt::ConfinementSettings confinement;
    bool confinementFails = false; ///< it can be neither read nor stored: with `sentence`
    velt::ActivitySubscriber activitySubscriber;
    velt::ActivityTotals activity;
    std::uint64_t lostRecords = 0;
    bool operationsFail = false; ///< with `sentence`
    std::string actor;           ///< of the last request
    std::string address;

    static FakeStandalone& instance();

    // What may also be done while a host runs, which looks at the history by itself.

    /// As it was at first.
    void reset();

    /// The failed logins up to now.
    std::vector<std::string> noted() const;

    /// Damages what is kept of a change.
    void damageChange(std::int64_t id);

    /// Announces that the service was started, stopped, ...
    void announce(const std::string& service, const std::string& action) const;
};

#endif
