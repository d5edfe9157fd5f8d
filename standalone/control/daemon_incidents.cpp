#include "standalone/control/daemon_incidents.h"

#include "standalone/journal/admin_log.h"
#include "standalone/journal/announce.h"

#include <syslog.h>

#include <array>

namespace velt {
namespace {

constexpr int logCategory = 2;
constexpr int logLevel = 1;
constexpr const char* killed = "its supervisor was killed";
constexpr const char* unseen = "the log of the daemon says why";

struct Wording {
    unsigned event;
    const char* action;
};

/// In the order of Incident::Kind.
constexpr std::array<Wording, 5> wordings{{
    {0x11BF0010, "ended"},
    {0x11BF0011, "recovered"},
    {0x11BF0012, "started"},
    {0x11BF0013, "stopped"},
    {0x11BF0014, "failed"},
}};

void complain(const Result<>& outcome) {
    if (!outcome) {
        ::syslog(LOG_ERR, "%s", outcome.error().message.c_str());
    }
}

} // namespace

std::vector<Incident> IncidentTeller::look(const DaemonState& now, bool byUs, bool lost) {
    std::vector<Incident> incidents;
    if (lost) {
        if (!down_) {
            incidents.push_back({Incident::Kind::ended, killed});
        }
        down_ = true;
    } else if (last_ && !byUs) {
        incidents = compare(now);
    }
    const bool isMeantToBeDown =
        now.state == RunState::stopped || now.state == RunState::paused || now.state == RunState::closed;
    if (isMeantToBeDown) {
        down_ = false;
    }
    // Whoever brought it back: its end was told.
    if (!lost && down_ && now.state == RunState::running) {
        incidents.push_back({Incident::Kind::recovered, ""});
        down_ = false;
    }
    last_ = now;
    return incidents;
}

std::vector<Incident> IncidentTeller::compare(const DaemonState& now) {
    const bool ran = last_->state == RunState::running;
    const bool runs = now.state == RunState::running;
    const bool sameSupervisor = now.supervisor == last_->supervisor;
    if (ran && now.state == RunState::failed) {
        down_ = true;
        return {{Incident::Kind::ended, now.reason}};
    }
    // It came back before anybody looked.
    if (ran && runs && (!sameSupervisor || now.restarts > last_->restarts)) {
        down_ = true;
        return {{Incident::Kind::ended, sameSupervisor ? unseen : killed}};
    }
    if (ran && !runs) {
        return {{Incident::Kind::stopped, ""}};
    }
    if (!ran && runs && !down_) {
        return {{Incident::Kind::started, ""}};
    }
    return {};
}

void recordIncident(const Daemon& daemon, const Incident& incident) {
    const Wording& wording = wordings.at(static_cast<std::size_t>(incident.kind));
    const std::string label(daemon.label);
    complain(logEvent(logCategory, logLevel, wording.event,
                      {label.c_str(), incident.reason.c_str(), nullptr, nullptr}));
    complain(announce("velt.service.action", {{"SERVICE_NAME", std::string(daemon.name)},
                                              {"SERVICE_ACTION", wording.action},
                                              {"REASON", incident.reason}}));
}

} // namespace velt
