// The files of the host while one system call after another fails: no token is lost or forgotten, and a state
// root has one veltd.
#include "host/api/token_store.h"
#include "host/base/instance_lock.h"
#include "tests/support/fault_sweep.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

namespace velt::test {
namespace {

using host::InstanceLock;
using host::Role;
using host::TokenStore;

class HostFaults : public testing::Test {
protected:
    TokenStore store() const { return TokenStore(file_); }

    /// "old other ": the tokens that are stored.
    std::string names() const {
        std::string all;
        for (const host::Token& token : store().tokens()) {
            all += token.name + " ";
        }
        return all;
    }

    /// A file with the tokens "old" and "other".
    void bringBack() {
        std::filesystem::remove_all(file_.parent_path());
        old_ = store().create("old", Role::admin);
        store().create("other", Role::viewer);
    }

    /// What `act` tells, or why it was refused.
    template<class Act> static std::string told(Act act) {
        try {
            return act();
        } catch (const host::TokenError& error) {
            return std::string("refused: ") + error.what();
        }
    }

    static bool isRefusal(const std::string& text) {
        return text.starts_with("refused: ") && text.ends_with(".");
    }

    TemporaryFolder root_;
    const std::filesystem::path file_ = root_.path() / host::tokenFileName;
    host::NewToken old_;
};

TEST_F(HostFaults, NeverForgetAToken) {
    bringBack();
    FaultSweep sweep;
    sweep.prepare = [] {};
    sweep.act = [this] {
        return told([this] { return std::string(store().find(old_.text) ? "known" : "unknown"); });
    };
    sweep.check = [](const SweptRun& run) {
        EXPECT_TRUE(run.end.told == "known" || isRefusal(run.end.told)) << run.end.told;
    };
    EXPECT_GE(sweepFaults(sweep), 3);
}

TEST_F(HostFaults, MakeAWholeTokenOrNone) {
    FaultSweep sweep;
    sweep.prepare = [this] { bringBack(); };
    sweep.act = [this] { return told([this] { return store().create("new", Role::admin).stored.name; }); };
    sweep.check = [this](const SweptRun& run) {
        const bool made = run.end.told == "new";
        EXPECT_TRUE(made || isRefusal(run.end.told)) << run.end.told;
        const std::string stored = names();
        EXPECT_TRUE(stored == "old other new " || (!made && stored == "old other ")) << stored;
        EXPECT_EQ(store().create("next", Role::viewer).stored.name, "next");
    };
    EXPECT_GE(sweepFaults(sweep), 8);
}

TEST_F(HostFaults, RemoveATokenOrSayThatItStays) {
    FaultSweep sweep;
    sweep.prepare = [this] { bringBack(); };
    sweep.act = [this] {
        return told([this] { return std::string(store().remove(old_.stored.id) ? "removed" : "unknown"); });
    };
    sweep.check = [this](const SweptRun& run) {
        const bool removed = run.end.told == "removed";
        EXPECT_TRUE(removed || isRefusal(run.end.told)) << run.end.told;
        const std::string stored = names();
        EXPECT_TRUE(stored == "other " || (!removed && stored == "old other ")) << stored;
    };
    EXPECT_GE(sweepFaults(sweep), 8);
}

TEST_F(HostFaults, LetNoSecondVeltdIn) {
    const auto first = InstanceLock::take(root_.path());
    ASSERT_TRUE(first);
    FaultSweep sweep;
    sweep.prepare = [] {};
    sweep.act = [this] {
        const auto second = InstanceLock::take(root_.path());
        return second ? std::string("taken") : "refused: " + second.error().message;
    };
    sweep.check = [](const SweptRun& run) { EXPECT_TRUE(isRefusal(run.end.told)) << run.end.told; };
    EXPECT_GE(sweepFaults(sweep), 2);
}

} // namespace
} // namespace velt::test
