// Random worlds, and random steps of those who use them or attack them.
#ifndef VELT_TESTS_MODEL_GENERATOR_H
#define VELT_TESTS_MODEL_GENERATOR_H

#include "tests/model/runner.h"

#include <deque>
#include <random>

namespace velt::model {

class Generator {
public:
    /// So many of a hundred logins of those who may are over SFTP.
    Generator(std::uint64_t seed, int overSftp) : random_(seed), overSftp_(overSftp) {}

    /// The administrator's first steps in an empty world.
    Steps world();

    /// What somebody does next.
    Step next(const Runner& runner);

private:
    int below(int limit) { return static_cast<int>(random_() % static_cast<unsigned>(limit)); }
    bool chance(int percent) { return below(100) < percent; }
    template<class Items> const auto& oneOf(const Items& items) {
        return *std::next(items.begin(), below(static_cast<int>(items.size())));
    }
    std::string anyOf(const std::vector<std::string>& words) { return oneOf(words); }

    // Of the world.
    std::string name();
    std::string mode();
    std::string owner();
    std::string target();
    Step share(const std::string& name);
    std::string grant();
    Step rules();
    Step switches();
    void addFolders(Steps& steps);

    // Of what is there.
    std::string folderIn(const Tree& tree);
    std::string placeIn(const Tree& tree);
    std::string placeOfNote(const World& world);
    std::string viewPath(const Runner& runner, const Session& session, bool folder);

    std::string mountedPath(const Runner& runner, const View& view);

    Step administer(const Runner& runner);
    Step inShell(const Runner& runner);
    Step ask(const Runner& runner);
    Step askOverSftp(const Runner& runner, const std::string& name, const Session& session);
    std::string sessionName();
    Step logIn(const std::string& session);
    void attack(const Runner& runner);
    void putInTheWay(const Runner& runner, const std::string& way);
    void lookAround(const std::string& session, const std::vector<Share>& shares);

    std::mt19937_64 random_;
    int overSftp_;
    std::vector<std::string> folders_; ///< of the world that is being made
    std::deque<Step> planned_;
};

} // namespace velt::model

#endif
