// Every store of the platform, for tests that interrupt it.
#ifndef VELT_TESTS_STANDALONE_CRASH_STORES_H
#define VELT_TESTS_STANDALONE_CRASH_STORES_H

#include "standalone/accounts/account_sources.h"
#include "tests/standalone/support/state_folder.h"

#include <gtest/gtest.h>

#include <span>
#include <string>

namespace velt::test {

/// A store as a test sees it. Each function is called in a process of its own.
struct Store {
    const char* name = "";
    int (*storeOld)() = nullptr;
    int (*storeNew)() = nullptr;
    std::string (*read)() = nullptr; ///< what is stored; "unreadable ..." when that cannot be told
    bool mayBeMissing = false;       ///< when it fails, nobody is told
};

std::span<const Store> stores();

/// How GoogleTest shows one.
void PrintTo(const Store& store, std::ostream* out);

/// "unreadable" and why the last call of the contract failed.
std::string unreadable();

std::string readRecord(); ///< of the FTP settings, to the byte
std::string readSftp();

/// A state root in which each store works. The accounts are ann (1000) and ben (1001).
class StoreTestBase : public testing::Test {
protected:
    void SetUp() override;
    void TearDown() override { setAccountSources({}); }

    StateFolder root_;
};

class StoreTest : public StoreTestBase, public testing::WithParamInterface<Store> {
protected:
    static std::string read();

    /// Brings the old back, with whatever an interrupted store has left lying about.
    static void storeOld();
};

} // namespace velt::test

#endif
