// The kept cases and random worlds, by real daemons of both protocols and by the model.
//
// VELT_MODEL_SEED, VELT_MODEL_STEPS, VELT_MODEL_MINUTES: the first seed, and how much is tried at least.
// VELT_MODEL_SFTP: how many of a hundred logins are over SFTP.
// VELT_MODEL_CASES: a file of other cases. A seed that was printed is tried again as the first one of part 0.
#include "tests/model/generator.h"
#include "tests/support/files.h"
#include "tests/system/support/files.h"
#include "tests/system/support/private_world.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdlib>
#include <iostream>
#include <set>
#include <sstream>

namespace velt::model {
namespace {

using Clock = std::chrono::steady_clock;

constexpr int stepsInAWorld = 80;

long numberIn(const char* variable, long otherwise) {
    const char* const text = std::getenv(variable);
    return text == nullptr ? otherwise : std::strtol(text, nullptr, 10);
}

struct KeptCase {
    std::string title;
    Steps steps;
};

/// Of a file with a line "case TITLE", then its steps, one a line, and so on.
std::vector<KeptCase> readCases(const std::string& file) {
    std::vector<KeptCase> cases;
    std::istringstream lines(test::contentsOf(file));
    for (std::string line; std::getline(lines, line);) {
        const Step words = parseStep(line);
        if (words.empty() || words[0].starts_with('#')) {
            continue;
        }
        if (words[0] == "case") {
            cases.push_back({line, {}});
        } else {
            cases.at(cases.size() - 1).steps.push_back(words);
        }
    }
    return cases;
}

/// The same by who logs in over SFTP, where that is possible.
Steps overSftp(Steps steps) {
    for (Step& step : steps) {
        if (step[0] == "login" && step.size() == 3 && step[2] != "ftp") {
            step.push_back("sftp");
        }
    }
    return steps;
}

std::string asCase(const Steps& steps) {
    std::string text = "case TITLE\n";
    for (const Step& step : steps) {
        text += "    " + formatStep(step) + "\n";
    }
    return text;
}

class AccessModel : public testing::Test {
protected:
    void SetUp() override {
        if (!test::whyNoWorld().empty()) {
            GTEST_SKIP() << test::whyNoWorld();
        }
        setenv("VELT_LIBEXEC_DIR", VELT_BUILT_FOLDER, 1);
        real_ = std::make_unique<RealWorld>();
        runner_ = std::make_unique<Runner>(*real_);
    }
    void TearDown() override {
        runner_.reset();
        real_.reset();
        test::clearFolders();
    }

    std::unique_ptr<RealWorld> real_;
    std::unique_ptr<Runner> runner_;
};

TEST_F(AccessModel, agreesWithTheDaemonsInTheKeptCases) {
    const char* const other = std::getenv("VELT_MODEL_CASES");
    const auto cases = readCases(other != nullptr ? other : VELT_MODEL_KEPT_CASES);
    EXPECT_FALSE(cases.empty());
    for (const KeptCase& kept : cases) {
        for (const Steps& steps : std::set{kept.steps, overSftp(kept.steps)}) {
            if (const auto failure = replay(*runner_, steps)) {
                ADD_FAILURE() << kept.title << (steps == kept.steps ? ": " : ", over SFTP: ")
                              << formatStep(steps[failure->step]) << " " << failure->what;
            }
        }
    }
}

class RandomWorlds : public AccessModel, public testing::WithParamInterface<int> {
protected:
    /// False, with the steps that show it, when the daemon and the model differ.
    bool agreeOnAWorld(std::uint64_t seed) {
        Generator generator(seed, static_cast<int>(numberIn("VELT_MODEL_SFTP", 50)));
        runner_->begin();
        Steps steps = generator.world();
        const std::size_t end = steps.size() + stepsInAWorld;
        for (std::size_t i = 0; i < end; i++) {
            if (i == steps.size()) {
                steps.push_back(generator.next(*runner_));
            }
            if (const std::string what = runner_->perform(steps[i]); !what.empty()) {
                std::cout << "seed " << seed << ": found after " << runner_->counts().steps << " steps and "
                          << seconds() << " s" << std::endl;
                report(seed, steps, what);
                return false;
            }
        }
        return true;
    }

    double seconds() const { return std::chrono::duration<double>(Clock::now() - start_).count(); }

    const Clock::time_point start_ = Clock::now();

private:
    void report(std::uint64_t seed, Steps steps, const std::string& what) {
        steps = shrink(*runner_, std::move(steps));
        const auto failure = replay(*runner_, steps);
        ADD_FAILURE() << "seed " << seed << ": "
                      << (failure ? formatStep(steps[failure->step]) + " " + failure->what
                                  : what + ", which does not come again")
                      << "\n"
                      << asCase(steps);
    }
};

TEST_P(RandomWorlds, areAsTheModelSays) {
    const long steps = numberIn("VELT_MODEL_STEPS", 2500);
    const auto end = start_ + std::chrono::minutes(numberIn("VELT_MODEL_MINUTES", 0));
    auto seed = static_cast<std::uint64_t>(numberIn("VELT_MODEL_SEED", 1) + GetParam() * 1000000L);
    bool agree = true;
    while (agree && (runner_->counts().steps < steps || Clock::now() < end)) {
        agree = agreeOnAWorld(seed++);
    }
    const Counts& counts = runner_->counts();
    std::cout << counts.steps << " steps in " << seconds() << " s, " << counts.logins << " logins; "
              << counts.asked << " asked of the daemons, of these " << counts.overSftp << " over SFTP, "
              << counts.decided << " decided by the model and " << counts.allowed << " allowed; last seed "
              << seed - 1 << std::endl;
    EXPECT_GT(counts.decided, counts.asked * 9 / 10);
    EXPECT_GT(counts.allowed, counts.asked / 10);
}

INSTANTIATE_TEST_SUITE_P(Part, RandomWorlds, testing::Range(0, 4));

} // namespace
} // namespace velt::model
