// Every store of the platform, while one system call after another fails: it says so, what is stored is the
// old or the new, whole, nothing is left lying about, and the next store works.
#include "standalone/contract/last_error.h"
#include "tests/standalone/crash/killed_process.h"
#include "tests/standalone/crash/stores.h"
#include "tests/support/fault_sweep.h"
#include "tests/support/text.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <set>

namespace velt::test {
namespace {

std::string storeNew(const Store& store) {
    return store.storeNew() < 0 ? "failed: " + lastErrorSentence() : "stored";
}

class StoreFaults : public StoreTest {
protected:
    std::set<std::string> files() const {
        std::set<std::string> names;
        for (const auto& entry : std::filesystem::recursive_directory_iterator(root_.path())) {
            names.insert(entry.path().lexically_relative(root_.path()));
        }
        return names;
    }
};

TEST_P(StoreFaults, AreToldAndLeaveTheOldOrTheNewWhole) {
    const Store& store = GetParam();
    storeOld();
    const std::string oldText = read();
    ASSERT_EQ(tellInChild([&] { return storeNew(store); }), "stored");
    const std::string newText = read();
    std::set<std::string> known = files();
    // The database takes these up when it is opened next.
    known.insert({"var/lib/velt/log.db-shm", "var/lib/velt/log.db-wal"});
    FaultSweep sweep;
    sweep.prepare = storeOld;
    sweep.act = [&] { return storeNew(store); };
    sweep.check = [&](const SweptRun& run) {
        const bool stored = run.end.told == "stored";
        const std::string text = read();
        EXPECT_TRUE(text == newText || (text == oldText && (!stored || store.mayBeMissing))) << text;
        const bool says = run.end.told.starts_with("failed: ") && contains(run.end.told, "annot ") &&
                          run.end.told.ends_with(".");
        EXPECT_TRUE(stored || says) << run.end.told;
        // One that cannot be locked may be another's; the next store takes it up.
        EXPECT_TRUE(run.call.name == "flock" || std::ranges::includes(known, files()))
            << testing::PrintToString(files());
        EXPECT_EQ(tellInChild([&] { return storeNew(store); }), "stored");
    };
    EXPECT_GE(sweepFaults(sweep), 8);
}

INSTANTIATE_TEST_SUITE_P(All, StoreFaults, testing::ValuesIn(stores()),
                         [](const auto& store) { return store.param.name; });

} // namespace
} // namespace velt::test
