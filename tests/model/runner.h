// Doing steps in the real world and in the model, and comparing the two.
#ifndef VELT_TESTS_MODEL_RUNNER_H
#define VELT_TESTS_MODEL_RUNNER_H

#include "tests/model/comparison.h"
#include "tests/model/real_world.h"

namespace velt::model {

struct Session {
    Account account;
    View view;
    long changes = 0; ///< of the world, at the login
    Protocol protocol = Protocol::ftp;
    std::unique_ptr<test::FileClient> client;
    std::optional<OpenFile> opened;
};

/// What a run was made of.
struct Counts {
    long steps = 0;
    long logins = 0;
    long asked = 0;    ///< steps of sessions
    long overSftp = 0; ///< of these
    long decided = 0;
    long allowed = 0;
};

class Runner {
public:
    explicit Runner(RealWorld& real) : real_(real) { begin(); }

    /// A world with nothing but the homes.
    void begin();

    /// What the service did against the model; "" when all is as it must be. A step that makes no sense now
    /// is left out.
    std::string perform(const Step& step);

    const World& world() const { return world_; }
    const std::map<std::string, Session>& sessions() const { return sessions_; }
    const Counts& counts() const { return counts_; }

private:
    void administer(const Step& step);
    void setShare(const Step& step);
    void setRules(const Step& step);
    std::string logIn(const Step& step);
    void logOut(const std::string& session);
    std::string ask(const Step& step, Session& session);
    std::string compare(const Step& step, Session& session, const Expectation& expected, Outcome& outcome);

    RealWorld& real_;
    World world_;
    std::map<std::string, Session> sessions_;
    std::vector<std::unique_ptr<test::FileClient>> ended_; ///< see RealWorld::clear
    Counts counts_;
    long written_ = 0; ///< no two files get the same content
};

/// The first step at which the service and the model differ, and how; nothing when they agree.
struct Failure {
    std::size_t step = 0;
    std::string what;
};
std::optional<Failure> replay(Runner& runner, const Steps& steps);

/// The fewest of these steps that still end in a failure, as far as leaving some out finds them.
Steps shrink(Runner& runner, Steps steps);

} // namespace velt::model

#endif
