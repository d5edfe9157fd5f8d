// A record that is stored by one caller while another has changed it.
#include "ftp/ftp_library.h"
#include "platform/sftp.h"
#include "standalone/settings/record_merge.h"
#include "tests/standalone/settings/settings_fixture.h"

#include <cstring>
#include <thread>

namespace velt {
namespace {

using Record = _tag_VELT_FTP_CONF_;

class RecordMerge : public test::SettingsTest {
protected:
    static Record stored() {
        Record record{};
        EXPECT_GE(VELTFTPConfGet(&record), 0) << lastErrorSentence();
        return record;
    }

    // Another caller's change: a thread of its own sees what is stored, and not what this one has seen.
    template<class Change> static void meanwhile(Change change) {
        std::thread([&change] {
            Record record = stored();
            change(record);
            EXPECT_GE(VELTFTPConfSet(record), 0) << lastErrorSentence();
        }).join();
    }
};

TEST_F(RecordMerge, KeepsWhatAnotherChangedSinceTheRead) {
    Record mine = stored();
    meanwhile([](Record& record) {
        record.max_conn_per_ip = 7;
        std::strcpy(record.anonymous_chroot_share, "public");
    });
    std::strcpy(mine.portnum, "2121");
    ASSERT_GE(VELTFTPConfSet(mine), 0) << lastErrorSentence();
    const Record now = stored();
    EXPECT_STREQ(now.portnum, "2121");
    EXPECT_EQ(now.max_conn_per_ip, 7);
    EXPECT_STREQ(now.anonymous_chroot_share, "public");
}

TEST_F(RecordMerge, ASwitchOfOneServiceLeavesTheOthers) {
    Record both = stored();
    both.service_flags = VELT_FTP_SERVICE_PLAIN | VELT_FTP_SERVICE_TLS;
    ASSERT_GE(VELTFTPConfSet(both), 0) << lastErrorSentence();
    Record mine = stored();
    meanwhile([](Record& record) { record.service_flags &= ~VELT_FTP_SERVICE_PLAIN; });
    mine.service_flags &= ~VELT_FTP_SERVICE_TLS;
    ASSERT_GE(VELTFTPConfSet(mine), 0) << lastErrorSentence();
    EXPECT_EQ(stored().service_flags, 0);
}

TEST_F(RecordMerge, TheLaterOfTwoChangesOfOneFieldStays) {
    Record mine = stored();
    meanwhile([](Record& record) { record.max_conn_per_ip = 7; });
    mine.max_conn_per_ip = 8;
    ASSERT_GE(VELTFTPConfSet(mine), 0);
    EXPECT_EQ(stored().max_conn_per_ip, 8);
}

TEST_F(RecordMerge, EveryFieldCanBeChangedAndBack) {
    const Record first = stored();
    Record other{};
    std::strcpy(other.portnum, "2121");
    std::strcpy(other.anonymous_chroot_share, "public");
    auto* numbers = &other.use_ext_ip;
    for (int i = 0; i < 14; ++i) {
        numbers[i] = 40001 + i;
    }
    ASSERT_GE(VELTFTPConfSet(other), 0) << lastErrorSentence();
    const Record now = stored();
    EXPECT_EQ(std::memcmp(&now, &other, sizeof(now)), 0);
    ASSERT_GE(VELTFTPConfSet(first), 0) << lastErrorSentence();
    const Record back = stored();
    EXPECT_EQ(std::memcmp(&back, &first, sizeof(back)), 0);
}

TEST_F(RecordMerge, ACallerThatStoresItsCopyAgainChangesWhatItChangedSince) {
    Record mine = stored();
    mine.maxuploadrate = 1;
    ASSERT_GE(VELTFTPConfSet(mine), 0);
    meanwhile([](Record& record) {
        record.maxuploadrate = 5;
        record.maxdownloadrate = 6;
    });
    mine.max_conn_per_ip = 2;
    ASSERT_GE(VELTFTPConfSet(mine), 0);
    const Record now = stored();
    EXPECT_EQ(now.maxuploadrate, 5);
    EXPECT_EQ(now.maxdownloadrate, 6);
    EXPECT_EQ(now.max_conn_per_ip, 2);
}

TEST_F(RecordMerge, ACallerThatHasReadNothingStoresAll) {
    meanwhile([](Record& record) { record.max_conn_per_ip = 7; });
    std::thread([] {
        Record fresh{};
        std::strcpy(fresh.portnum, "2121");
        EXPECT_GE(VELTFTPConfSet(fresh), 0) << lastErrorSentence();
    }).join();
    EXPECT_EQ(stored().max_conn_per_ip, 0);
    EXPECT_EQ(stored().support_utf8, 0);
}

TEST_F(RecordMerge, WhatWasReadBelowAnotherRootDoesNotCount) {
    Record mine = stored();
    const test::StateFolder other;
    meanwhile([](Record& record) { record.max_conn_per_ip = 7; });
    mine.support_utf8 = 0;
    ASSERT_GE(VELTFTPConfSet(mine), 0) << lastErrorSentence();
    EXPECT_EQ(stored().max_conn_per_ip, 0);
}

TEST_F(RecordMerge, IsRefusedWhenTheTwoChangesDoNotGoTogether) {
    Record mine = stored();
    meanwhile([](Record& record) {
        record.passive_port_min = 30000;
        record.passive_port_max = 30100;
    });
    std::strcpy(mine.portnum, "30050");
    EXPECT_LT(VELTFTPConfSet(mine), 0);
    EXPECT_NE(lastErrorSentence().find("contains the FTP port 30050"), std::string::npos)
        << lastErrorSentence();
    EXPECT_STREQ(stored().portnum, "21");
}

TEST_F(RecordMerge, TheCandidateOfTheDaemonIsTheMergedRecord) {
    Record mine = stored();
    meanwhile([](Record& record) { record.max_conn_per_ip = 7; });
    mine.service_flags = VELT_FTP_SERVICE_PLAIN;
    ASSERT_GE(VELTFTPConfSet(mine), 0);
    ASSERT_EQ(test::fakeCandidate().ftp.size(), 1U);
    EXPECT_EQ(test::fakeCandidate().ftp[0].record.max_conn_per_ip, 7);
}

TEST_F(RecordMerge, ARefusedStoreIsNotTakenForSeen) {
    Record mine = stored();
    mine.max_conn_per_ip = 5;
    std::strcpy(mine.portnum, "0");
    EXPECT_LT(VELTFTPConfSet(mine), 0);
    std::strcpy(mine.portnum, "2121");
    ASSERT_GE(VELTFTPConfSet(mine), 0) << lastErrorSentence();
    EXPECT_EQ(stored().max_conn_per_ip, 5);
}

TEST_F(RecordMerge, HoldsForSftpAsWell) {
    _tag_VELT_SFTP_CONFIG_ mine{};
    ASSERT_GE(VELTSFTPConfigGet(1, &mine), 0);
    std::thread([] { EXPECT_GE(VELTSFTPConfigSet(1, 2222), 0) << lastErrorSentence(); }).join();
    ASSERT_GE(VELTSFTPConfigSet(0, 2200), 0) << "the port is changed, the switch is as it was read";
    ASSERT_GE(VELTSFTPConfigGet(1, &mine), 0);
    EXPECT_EQ(mine.port, 2200);
    EXPECT_EQ(mine.enable, 1);
}

} // namespace
} // namespace velt
