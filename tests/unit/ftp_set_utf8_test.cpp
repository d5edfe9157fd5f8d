// Setting UTF-8: the key, the rules and the effects of each version.

#include "module/entry_functions.h"
#include "tests/unit/ftp_journal.h"

#include <string>

using namespace ftptest;

namespace {

/// The stored state, what is asked for, and what follows.
struct Row {
    int support = 0;
    int use = 0;
    const char* requested = nullptr;
    const char* useSet = nullptr;   ///< the argument of the switch's setter
    const char* supports = nullptr; ///< what is stored
    bool applies = false;
};

constexpr Row unchanged(int support, int use, const char* requested) {
    return {support, use, requested};
}

constexpr Row sets(int support, int use, const char* requested, const char* useSet,
                   const char* supports = nullptr) {
    return {support, use, requested, useSet, supports, true};
}

class FTPSetUtf8Test : public FTPTest {
protected:
    void expectRow(VELT::APIEntryFunction entry, const std::string& key, const Row& row) {
        SCOPED_TRACE(key + " " + row.requested + " over support " + std::to_string(row.support) + ", use " +
                     std::to_string(row.use));
        startAfresh();
        platform.conf.support_utf8 = row.support;
        platform.useUtf8 = row.use;
        Lines steps = {useUtf8Get};
        if (row.useSet != nullptr) {
            steps.push_back("VELTFTPUseUTF8Set(" + std::string(row.useSet) + ")");
        }
        const std::string differences =
            row.supports == nullptr ? "" : "support_utf8: " + std::string(row.supports);
        EXPECT_EQ(run(entry, request("\"" + key + "\":" + row.requested)),
                  Lines{getParams()} +
                      (row.applies ? applied(steps, differences) : reads() + steps + succeeded()));
    }
};

const char* const noUseWithoutSupport = "Cannot set ftp_use_utf8='yes' when ftpsupportutf8='no'.";
const char* const noSupportOffWithUse = "Cannot set ftpsupportutf8='no' when ftp_use_utf8='yes'.";

} // namespace

TEST_F(FTPSetUtf8Test, Version3SetsSupportAndUseByTheMode) {
    const Row rows[] = {// The mode is 0.
                        unchanged(0, 0, "0"), sets(0, 0, "1", "0", "1"), sets(0, 0, "2", "1", "1"),
                        // It is 0 whatever the switch says.
                        unchanged(0, 1, "0"), sets(0, 1, "1", "0", "1"), sets(0, 1, "2", "1", "1"),
                        // It is 1.
                        sets(1, 0, "0", "0", "0"), unchanged(1, 0, "1"), sets(1, 0, "2", "1"),
                        // It is 2.
                        sets(1, 1, "0", "0", "0"), sets(1, 1, "1", "0"), unchanged(1, 1, "2"),
                        // Any other value is on, and becomes 1 when a mode is set.
                        unchanged(-1, -1, "2"), sets(7, 7, "1", "0", "1"), unchanged(7, 0, "1"),
                        sets(7, 0, "2", "1", "1")};
    for (const Row& row : rows) {
        expectRow(FTPSetV3, "utf8_mode", row);
        expectRow(setVersion4, "utf8_mode", row);
    }
}

TEST_F(FTPSetUtf8Test, Version2SetsTheUseAlone) {
    const Row rows[] = {unchanged(0, 0, "false"), sets(0, 1, "false", "0"),  unchanged(0, 1, "true"),
                        unchanged(1, 0, "false"), sets(1, 0, "true", "1"),   sets(1, 1, "false", "0"),
                        unchanged(1, 1, "true"),  unchanged(0, -1, "true"),  sets(0, -1, "false", "0"),
                        sets(7, 0, "true", "1"),  sets(-1, 7, "false", "0"), unchanged(1, 7, "true")};
    for (const Row& row : rows) {
        expectRow(FTPSetV2, "use_utf8", row);
    }
}

TEST_F(FTPSetUtf8Test, Version1SetsTheSupportAlone) {
    const Row rows[] = {
        unchanged(0, 0, "false"),         sets(0, 0, "true", nullptr, "1"),  unchanged(0, 1, "false"),
        sets(0, 1, "true", nullptr, "1"), sets(1, 0, "false", nullptr, "0"), unchanged(1, 0, "true"),
        unchanged(1, 1, "true"),          sets(7, 0, "false", nullptr, "0"), unchanged(-1, 0, "true")};
    for (const Row& row : rows) {
        expectRow(FTPSet, "enable_utf8", row);
        expectRow(setVersion0, "enable_utf8", row);
    }
}

TEST_F(FTPSetUtf8Test, Version2IgnoresUseWithoutSupport) {
    EXPECT_EQ(run(FTPSetV2, request(R"("use_utf8":true)")),
              Lines{getParams()} + reads() + useUtf8Get + log(noUseWithoutSupport) + succeeded());
    EXPECT_EQ(platform.useUtf8, 0);
}

TEST_F(FTPSetUtf8Test, Version2AppliesTheRestOfARequestWhoseUseIsIgnored) {
    EXPECT_EQ(run(FTPSetV2, request(R"("use_utf8":true,"enable_fxp":true)")),
              Lines{getParams()} + applied(Lines{useUtf8Get} + log(noUseWithoutSupport), "enable_fxp: 1"));
    EXPECT_EQ(platform.useUtf8, 0);
}

TEST_F(FTPSetUtf8Test, Version1IgnoresSupportOffWhileItIsUsed) {
    for (const int use : {1, 7, -1}) {
        for (const VELT::APIEntryFunction entry : {FTPSet, setVersion0}) {
            platform.conf.support_utf8 = 7;
            platform.useUtf8 = use;
            EXPECT_EQ(run(entry, request(R"("enable_utf8":false)")),
                      Lines{getParams()} + reads() + useUtf8Get + log(noSupportOffWithUse) + succeeded());
            EXPECT_EQ(platform.conf.support_utf8, 7);
        }
    }
}

TEST_F(FTPSetUtf8Test, Version1AppliesTheRestOfARequestWhoseSupportIsIgnored) {
    platform.conf.support_utf8 = 1;
    platform.useUtf8 = 1;
    EXPECT_EQ(run(FTPSet, request(R"("enable_utf8":false,"enable_fxp":true)")),
              Lines{getParams()} + applied(Lines{useUtf8Get} + log(noSupportOffWithUse), "enable_fxp: 1"));
}

TEST_F(FTPSetUtf8Test, TheKeysOfOtherVersionsHaveNoEffect) {
    const std::string support = R"("enable_utf8":true)";
    const std::string use = R"("use_utf8":true)";
    const std::string mode = R"("utf8_mode":2)";
    const struct {
        VELT::APIEntryFunction entry;
        std::string more;
    } rows[] = {{setVersion0, use + "," + mode},
                {FTPSet, use + "," + mode},
                {FTPSetV2, support + "," + mode},
                {FTPSetV3, support + "," + use},
                {setVersion4, support + "," + use}};
    for (const auto& row : rows) {
        EXPECT_EQ(run(row.entry, request(row.more)), Lines{getParams()} + reads() + useUtf8Get + succeeded());
    }
}
