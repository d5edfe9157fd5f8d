// Loading, walking the table, unloading.

#include "platform/webapi.h"

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <string>

namespace {

using GetTable = const VELT::APITableRow* (*)();

struct ExpectedRow {
    const char* api;
    int version;
    const char* method;
};

constexpr ExpectedRow expectedRows[] = {
    {"VELT.Core.FileServ.FTP", 1, "get"},
    {"VELT.Core.FileServ.FTP", 1, "set"},
    {"VELT.Core.FileServ.FTP", 2, "get"},
    {"VELT.Core.FileServ.FTP", 2, "set"},
    {"VELT.Core.FileServ.FTP", 3, "get"},
    {"VELT.Core.FileServ.FTP", 3, "set"},
    {"VELT.Core.FileServ.FTP.Security", 1, "get"},
    {"VELT.Core.FileServ.FTP.Security", 1, "set"},
    {"VELT.Core.FileServ.FTP.Security", 1, "list_ftp_share"},
    {"VELT.Core.FileServ.FTP.ChrootUser", 1, "list"},
    {"VELT.Core.FileServ.FTP.ChrootUser", 1, "add"},
    {"VELT.Core.FileServ.FTP.ChrootUser", 1, "delete"},
    {"VELT.Core.FileServ.FTP.ChrootUser", 2, "load"},
    {"VELT.Core.FileServ.FTP.ChrootUser", 2, "save"},
    {"VELT.Core.FileServ.FTP.SFTP", 1, "get"},
    {"VELT.Core.FileServ.FTP.SFTP", 1, "set"},
};

class Load : public testing::Test {
protected:
    void SetUp() override {
        module_ = dlopen(MODULE_PATH, RTLD_NOW | RTLD_LOCAL);
        ASSERT_NE(module_, nullptr) << dlerror();
    }
    void TearDown() override { EXPECT_EQ(dlclose(module_), 0); }

    void* symbol(const char* name) const { return dlsym(module_, name); }
    const VELT::APITableRow* table() const {
        return reinterpret_cast<GetTable>(symbol("GetAPITable"))(); // NOLINT(*-reinterpret-cast)
    }

    void* module_ = nullptr;
};

TEST_F(Load, TheTableHoldsTheSixteenRowsInOrderAndEndsInZeros) {
    const VELT::APITableRow* row = table();
    for (const ExpectedRow& expected : expectedRows) {
        EXPECT_STREQ(row->api, expected.api);
        EXPECT_EQ(row->version, expected.version);
        EXPECT_STREQ(row->method, expected.method);
        EXPECT_NE(row->entry, nullptr);
        ++row;
    }
    EXPECT_EQ(row->api, nullptr);
    EXPECT_EQ(row->version, 0);
    EXPECT_EQ(row->method, nullptr);
    EXPECT_EQ(row->entry, nullptr);
}

TEST_F(Load, EveryRowHasAnEntryFunctionOfItsOwn) {
    for (int i = 0; i < 16; ++i) {
        for (int j = 0; j < i; ++j) {
            EXPECT_NE(table()[i].entry, table()[j].entry) << i << " and " << j;
        }
    }
}

TEST_F(Load, EveryCallHandsOutTheExportedTable) {
    EXPECT_EQ(table(), table());
    EXPECT_EQ(static_cast<const void*>(table()), symbol("gTable"));
}

TEST(Reload, AHundredLoadsAndUnloadsLeaveNothingBehind) {
    for (int i = 0; i < 100; ++i) {
        void* const module = dlopen(MODULE_PATH, RTLD_NOW | RTLD_LOCAL);
        ASSERT_NE(module, nullptr) << dlerror();
        EXPECT_NE(dlsym(module, "GetAPITable"), nullptr);
        ASSERT_EQ(dlclose(module), 0);
        ASSERT_EQ(dlopen(MODULE_PATH, RTLD_NOW | RTLD_NOLOAD), nullptr) << "still loaded after unload " << i;
    }
}

} // namespace
