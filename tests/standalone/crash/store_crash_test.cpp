// Every store of the platform, killed at every one of its steps: what is found afterwards is the old or the
// new, whole, and the next store works.
#include "standalone/contract/boundary.h"
#include "standalone/standalone.h"
#include "tests/standalone/crash/killed_process.h"
#include "tests/standalone/crash/stores.h"

#include <gtest/gtest.h>

#include <set>

namespace velt::test {
namespace {

class StoreCrash : public StoreTest {};

TEST_P(StoreCrash, LeavesTheOldOrTheNewWhole) {
    storeOld();
    const std::string oldText = read();
    std::set<std::string> found;
    int call = 0;
    Ending ending = Ending::killed;
    while ((ending = killAtCall(call, GetParam().storeNew)) == Ending::killed) {
        found.insert(read());
        storeOld();
        ASSERT_EQ(read(), oldText) << "after call " << call;
        ++call;
    }
    ASSERT_EQ(ending, Ending::succeeded);
    const std::string newText = read();
    EXPECT_NE(newText, oldText);
    EXPECT_EQ(newText.find("unreadable"), std::string::npos) << newText;
    found.insert(newText);
    EXPECT_EQ(found, (std::set<std::string>{oldText, newText}));
    EXPECT_GE(call, 3) << "open, write and rename, or the like";
    RecordProperty("steps", call);
}

INSTANTIATE_TEST_SUITE_P(All, StoreCrash, testing::ValuesIn(stores()),
                         [](const auto& store) { return store.param.name; });

class FirstStartCrash : public testing::Test {
protected:
    StateFolder root_;
};

TEST_F(FirstStartCrash, LeavesNoSettingsOrWholeDefaults) {
    const auto openHere = [this] { return toContract(openState(root_.path())); };
    const auto readBoth = [] { return readRecord() + readSftp(); };
    const std::string defaults = tellInChild(readBoth);
    int call = 0;
    Ending ending = Ending::killed;
    while ((ending = killAtCall(call, openHere)) == Ending::killed) {
        ASSERT_EQ(tellInChild(readBoth), defaults) << "after call " << call;
        for (const char* file : {"/etc/velt/ftp.conf", "/etc/velt/sftp.conf"}) {
            std::filesystem::remove(statePath(file));
        }
        ++call;
    }
    ASSERT_EQ(ending, Ending::succeeded);
    EXPECT_EQ(tellInChild(readBoth), defaults);
    EXPECT_GE(call, 10);
}

} // namespace
} // namespace velt::test
