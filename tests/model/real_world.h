// The real counterpart of the model's world: folders on disk, the files of shares and rules, users with a
// shell, and running daemons.
#ifndef VELT_TESTS_MODEL_REAL_WORLD_H
#define VELT_TESTS_MODEL_REAL_WORLD_H

#include "tests/model/policy.h"
#include "tests/model/step.h"
#include "tests/system/support/daemon_process.h"
#include "tests/system/support/file_client.h"

#include <list>

namespace velt::model {

/// Lives in the private world of the system tests.
class RealWorld {
public:
    RealWorld();
    ~RealWorld();
    RealWorld(const RealWorld&) = delete;
    RealWorld& operator=(const RealWorld&) = delete;

    /// Only the homes are left, and nothing is shared. No session may live on.
    void clear();

    /// What exists now below /mnt/srv and /mnt/home.
    Tree look() const;

    // Steps of the administrator, and of a user with a shell, as in step.h. They may fail.
    void layDown(const Step& step, const std::string& data) const;
    void inShell(const Step& step, const std::string& data) const;

    void storeShares(const std::vector<Share>& shares) const;
    void storeRules(const std::vector<Rule>& rules) const;

    /// At a daemon that runs with these switches, which are among `possibleSwitches`.
    std::unique_ptr<test::FileClient> logIn(const Switches& switches, const Account& account,
                                            test::Protocol protocol) const;

private:
    struct Server {
        Switches switches;
        test::Protocol protocol = test::Protocol::ftp;
        int turn = 0; ///< -1: it serves in all
        int port = 0;
        std::string stateRoot;
        test::DaemonProcess daemon;
    };

    void add(const Switches& switches, test::Protocol protocol, int turn);
    bool isServing(const Server& server) const { return server.turn == turn_ || server.turn < 0; }

    void storeFile(const std::string& name, const std::string& text) const;

    std::list<Server> servers_;
    int turn_ = 0;
};

const std::vector<Switches>& possibleSwitches();

} // namespace velt::model

#endif
