// What is told of daemons that this process did not touch.
#include "standalone/control/daemon_incidents.h"

#include <gtest/gtest.h>

namespace velt {

// For the messages of failed comparisons.
void PrintTo(const Incident& incident, std::ostream* out) {
    *out << static_cast<int>(incident.kind) << " " << incident.reason;
}

namespace {

using Kind = Incident::Kind;
using Incidents = std::vector<Incident>;

constexpr ProcessId first{100, 1};
constexpr ProcessId second{200, 2};

DaemonState state(RunState run, ProcessId supervisor = first, std::uint64_t restarts = 0,
                  const std::string& reason = "") {
    DaemonState made;
    made.state = run;
    made.supervisor = supervisor;
    made.restarts = restarts;
    made.reason = reason;
    return made;
}

const DaemonState running = state(RunState::running);
const DaemonState stopped;

/// What the states tell that come after one another, without anything of ours.
Incidents told(const std::vector<DaemonState>& states) {
    IncidentTeller teller;
    Incidents all;
    for (const DaemonState& each : states) {
        for (const Incident& incident : teller.look(each, false, false)) {
            all.push_back(incident);
        }
    }
    return all;
}

TEST(Incidents, NothingIsToldOfWhatWasThereBefore) {
    EXPECT_EQ(told({running, running}), Incidents());
    EXPECT_EQ(told({stopped, stopped}), Incidents());
    EXPECT_EQ(told({state(RunState::failed, {}, 0, "no luck")}), Incidents());
}

TEST(Incidents, ADaemonThatDiesAndComesBackIsToldTwice) {
    EXPECT_EQ(told({running, state(RunState::failed, first, 0, "it was killed by signal 9"),
                    state(RunState::failed, first, 0, "it was killed by signal 9"),
                    state(RunState::running, first, 1)}),
              (Incidents{{Kind::ended, "it was killed by signal 9"}, {Kind::recovered, ""}}));
}

TEST(Incidents, ADaemonThatCameBackUnseenIsToldTwice) {
    EXPECT_EQ(told({running, state(RunState::running, first, 1)}),
              (Incidents{{Kind::ended, "the log of the daemon says why"}, {Kind::recovered, ""}}));
    EXPECT_EQ(told({running, state(RunState::running, second)}),
              (Incidents{{Kind::ended, "its supervisor was killed"}, {Kind::recovered, ""}}));
}

TEST(Incidents, WhatOthersStartAndStopIsTold) {
    EXPECT_EQ(told({running, stopped, running}), (Incidents{{Kind::stopped, ""}, {Kind::started, ""}}));
    EXPECT_EQ(told({running, state(RunState::paused), running}),
              (Incidents{{Kind::stopped, ""}, {Kind::started, ""}}));
}

TEST(Incidents, WhatWeStartAndStopIsNot) {
    IncidentTeller teller;
    teller.look(running, false, false);
    EXPECT_EQ(teller.look(stopped, true, false), Incidents());
    EXPECT_EQ(teller.look(running, true, false), Incidents());
    EXPECT_EQ(teller.look(running, false, false), Incidents());
}

TEST(Incidents, AnEndIsFollowedByTheReturnWhoeverBroughtIt) {
    IncidentTeller teller;
    teller.look(running, false, false);
    EXPECT_EQ(teller.look(running, false, true), (Incidents{{Kind::ended, "its supervisor was killed"}}));
    EXPECT_EQ(teller.look(running, true, true), Incidents()) << "told once";
    EXPECT_TRUE(teller.tellsRecovery());
    EXPECT_EQ(teller.look(state(RunState::running, second), true, false), (Incidents{{Kind::recovered, ""}}));
    EXPECT_FALSE(teller.tellsRecovery());
}

TEST(Incidents, WhoIsStoppedAfterAnEndDoesNotComeBack) {
    IncidentTeller teller;
    teller.look(running, false, false);
    EXPECT_EQ(teller.look(state(RunState::failed, first, 0, "x"), false, false),
              (Incidents{{Kind::ended, "x"}}));
    EXPECT_EQ(teller.look(stopped, true, false), Incidents());
    EXPECT_EQ(teller.look(running, true, false), Incidents());
}

} // namespace
} // namespace velt
