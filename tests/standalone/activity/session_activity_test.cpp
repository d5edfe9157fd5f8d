// A session tells of itself, and others read it.
#include "standalone/activity/session_activity.h"

#include "standalone/activity/activity_reader.h"
#include "standalone/activity/session_pages.h"
#include "standalone/activity/spool.h"
#include "standalone/activity/spool_text.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"
#include "tests/support/waiting.h"

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <functional>
#include <iterator>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace velt {
namespace {

constexpr velt_session anna{velt_ftps, "TLSv1.3 X", "anna", "anna", "192.0.2.1", "abc"};

class SessionActivity : public testing::Test {
protected:
    void TearDown() override { end(); }

    /// A process that does this as a session, and then waits until it is ended.
    void begin(const std::function<void()>& act) {
        int ready[2] = {-1, -1};
        ASSERT_EQ(pipe(ready), 0);
        child_ = fork();
        if (child_ == 0) {
            velt_begin_activity(root_.path().c_str());
            velt_expect_session();
            act();
            static_cast<void>(!write(ready[1], "", 1));
            pause();
            _exit(0);
        }
        char octet = 0;
        EXPECT_EQ(read(ready[0], &octet, 1), 1);
        close(ready[0]);
        close(ready[1]);
    }

    void end() {
        if (child_ > 0) {
            kill(child_, SIGKILL);
            waitpid(child_, nullptr, 0);
            child_ = -1;
        }
    }

    static std::vector<velt_session_page> pages() {
        std::vector<velt_session_page> all;
        const auto visited = visitSessionPages(
            [&](const SessionName&, const velt_session_page& page) { all.push_back(page); });
        EXPECT_EQ(test::messageOf(visited), "");
        return all;
    }

    std::ptrdiff_t files() const {
        return std::distance(std::filesystem::directory_iterator(root_.path() / "run/velt/sessions"), {});
    }

    std::vector<OperationRecord> records() {
        return parseSpool(root_.read("var/lib/velt/transfers/spool")).records;
    }

    /// "KIND RESULT PATH OCTETS; ..."
    std::string told() {
        std::string all;
        for (const OperationRecord& each : records()) {
            all += std::string(all.empty() ? "" : "; ") + std::string(operationName(each.operation)) + " " +
                   std::string(operationResultName(each.result)) + " " + each.place.path + " " +
                   (each.octets ? std::to_string(*each.octets) : each.reason);
        }
        return all;
    }

    test::StateFolder root_;
    pid_t child_ = -1;
};

TEST_F(SessionActivity, ShowsWhoIsLoggedIn) {
    begin([] {
        velt_session_opened(&anna);
        velt_command_began("MKD", "/x");
    });
    const auto all = pages();
    ASSERT_EQ(all.size(), 1U);
    EXPECT_EQ(fieldText(all[0].user), "anna");
    EXPECT_EQ(fieldText(all[0].command), "MKD");
    EXPECT_EQ(fieldText(all[0].path), "/x");
    EXPECT_EQ(all[0].busy, 1U);
    EXPECT_EQ(all[0].protocol, static_cast<std::uint32_t>(velt_ftps));
}

TEST_F(SessionActivity, NamesItsProcess) {
    std::vector<SessionName> names;
    begin([] { velt_session_opened(&anna); });
    const auto visited =
        visitSessionPages([&](const SessionName& name, const velt_session_page&) { names.push_back(name); });
    ASSERT_EQ(names.size(), 1U);
    EXPECT_EQ(names[0].process, identifyProcess(child_));
    EXPECT_TRUE(bootId().starts_with(names[0].boot));
}

TEST_F(SessionActivity, RecordsATransfer) {
    begin([] {
        velt_session_opened(&anna);
        velt_transfer_began(velt_upload, "/a");
        velt_transfer_moved(100);
        const velt_record upload{"upload", "done", nullptr, "/a", nullptr, nullptr, 250, 1000};
        velt_transfer_ended(&upload);
        velt_session_closed("logged out");
    });
    EXPECT_EQ(told(), "session-opened done  ; upload done /a 250; session-closed done  logged out");
    const auto all = records();
    ASSERT_EQ(all.size(), 3U);
    EXPECT_EQ(all[1].user, "anna");
    EXPECT_EQ(all[1].place.serverPath, "/a");
    EXPECT_EQ(all[1].duration, std::chrono::microseconds(1000));
    EXPECT_EQ(all[2].octetsIn, 250U);
    EXPECT_EQ(all[2].octetsOut, 0U);
    EXPECT_EQ(pages().size(), 0U);
}

TEST_F(SessionActivity, ShowsARunningTransfer) {
    begin([] {
        velt_session_opened(&anna);
        velt_transfer_began(velt_download, "/a");
        velt_transfer_moved(100);
        velt_command_ended();
    });
    const auto all = pages();
    ASSERT_EQ(all.size(), 1U);
    EXPECT_EQ(all[0].transfer, static_cast<std::uint32_t>(velt_download));
    EXPECT_EQ(all[0].transfer_octets, 100U);
    EXPECT_EQ(fieldText(all[0].transfer_path), "/a");
    EXPECT_EQ(all[0].busy, 1U);
}

TEST_F(SessionActivity, OfAKilledSessionIsCompletedByWhoLooks) {
    begin([] {
        velt_session_opened(&anna);
        velt_transfer_began(velt_upload, "/a");
        velt_transfer_moved(100);
    });
    EXPECT_EQ(pages().size(), 1U);
    end();
    EXPECT_EQ(pages().size(), 0U);
    EXPECT_EQ(told(),
              "session-opened done  ; upload incomplete /a 100; session-closed done  its process was killed");
    EXPECT_EQ(pages().size(), 0U);
    ASSERT_EQ(records().size(), 3U);
    EXPECT_EQ(records()[2].octetsIn, 100U);
}

TEST_F(SessionActivity, SaysWhoEndedIt) {
    begin([] { velt_session_opened(&anna); });
    std::vector<SessionName> names;
    static_cast<void>(
        visitSessionPages([&](const SessionName& name, const velt_session_page&) { names.push_back(name); }));
    ASSERT_EQ(names.size(), 1U);
    EXPECT_EQ(noteSessionEnd(names[0], "carol", "too much"), true);
    end();
    EXPECT_EQ(pages().size(), 0U);
    EXPECT_EQ(told(), "session-opened done  ; session-closed done  ended by carol: too much");
}

TEST_F(SessionActivity, KeepsItsPageAsLongAsOneOfItsProcessesLives) {
    int hold[2] = {-1, -1};
    ASSERT_EQ(pipe(hold), 0);
    begin([&hold] {
        velt_session_opened(&anna);
        if (fork() == 0) {
            char octet = 0;
            close(hold[1]);
            static_cast<void>(!read(hold[0], &octet, 1));
            _exit(0);
        }
    });
    end();
    EXPECT_EQ(pages().size(), 1U);
    close(hold[0]);
    close(hold[1]);
    EXPECT_TRUE(test::waitUntil([] { return pages().empty(); }, test::patience));
}

TEST_F(SessionActivity, IsNotShownBeforeItsLogin) {
    begin([] {});
    EXPECT_EQ(pages().size(), 0U);
    EXPECT_EQ(files(), 2) << "the page, and the count of what was lost";
    end();
    EXPECT_EQ(pages().size(), 0U);
    EXPECT_EQ(files(), 1);
    EXPECT_EQ(told(), "");
}

TEST_F(SessionActivity, LeavesAnEmptyPageWhereItMayNotRemoveIt) {
    begin([] {
        velt_session_opened(&anna);
        if (setresuid(1001, 1001, 1001) == 0) {
            velt_session_closed("logged out");
        }
        velt_command_began("NOOP", nullptr);
    });
    if (geteuid() != 0) {
        GTEST_SKIP() << "needs root";
    }
    EXPECT_EQ(files(), 2);
    EXPECT_EQ(told(), "session-opened done  ; session-closed done  logged out");
    EXPECT_EQ(pages().size(), 0U);
    EXPECT_EQ(files(), 1);
    EXPECT_EQ(records().size(), 2U);
}

TEST_F(SessionActivity, OfSeveralProcessesIsClosedByOneAndWrittenByOthers) {
    if (geteuid() != 0) {
        GTEST_SKIP() << "needs root";
    }
    begin([] {
        velt_share_session();
        velt_session_opened(&anna);
        if (setresuid(1001, 1001, 1001) == 0) {
            velt_session_closed("logged out");
        }
        const velt_record upload{"upload", "incomplete", nullptr, "/a", nullptr, nullptr, 5, 1};
        velt_record_operation(&upload);
    });
    EXPECT_EQ(told(), "session-opened done  ; session-closed done  logged out; upload incomplete /a 5");
    EXPECT_EQ(pages().size(), 0U) << "it is closed";
    EXPECT_EQ(files(), 2);
    end();
    EXPECT_EQ(pages().size(), 0U);
    EXPECT_EQ(files(), 1);
    EXPECT_EQ(records().size(), 3U);
}

TEST_F(SessionActivity, RemovesThePagesOfOthersThatHaveEnded) {
    root_.write("run/velt/sessions/1-2-00000000", "");
    root_.write("run/velt/sessions/1-3-00000000", "x");
    velt_session_page page{};
    page.form = velt_page_form;
    root_.write("run/velt/sessions/1-4-00000000",
                std::string(reinterpret_cast<const char*>(&page), sizeof page));
    page.closed = 1;
    root_.write("run/velt/sessions/1-5-00000000",
                std::string(reinterpret_cast<const char*>(&page), sizeof page));
    begin([] { velt_session_opened(&anna); });
    EXPECT_EQ(files(), 4) << "the count of what was lost, 1-3, 1-4 and its own";
}

TEST_F(SessionActivity, OfManySessionsAtOnceLosesNothing) {
    constexpr int sessions = 8;
    constexpr int each = 500;
    std::vector<pid_t> children;
    for (int i = 0; i < sessions; ++i) {
        children.push_back(fork());
        if (children.back() == 0) {
            velt_begin_activity(root_.path().c_str());
            velt_expect_session();
            velt_session_opened(&anna);
            const std::string path = "/" + std::string(static_cast<std::size_t>(1) << (i + 4), 'x');
            for (int done = 0; done < each; ++done) {
                velt_transfer_began(velt_upload, path.c_str());
                const velt_record upload{"upload", "done", nullptr, path.c_str(), nullptr, nullptr, 1, 1};
                velt_transfer_ended(&upload);
            }
            velt_session_closed("logged out");
            _exit(0);
        }
    }
    for (const pid_t child : children) {
        waitpid(child, nullptr, 0);
    }
    const SpoolText all = parseSpool(root_.read("var/lib/velt/transfers/spool"));
    EXPECT_EQ(all.records.size(), static_cast<std::size_t>(sessions * (each + 2)));
    EXPECT_EQ(all.damaged, 0U);
    std::set<std::pair<std::string, std::int64_t>> keys;
    for (const OperationRecord& record : all.records) {
        keys.emplace(record.session, record.number);
    }
    EXPECT_EQ(keys.size(), all.records.size());
    EXPECT_EQ(lostRecords(), 0U);
}

TEST_F(SessionActivity, RecordsARefusedLogin) {
    begin([] {
        velt_login_was_refused(&anna, "password");
        velt_session_opened(&anna);
    });
    EXPECT_EQ(told(), "login-refused refused  password; session-opened done  ");
    ASSERT_EQ(records().size(), 2U);
    EXPECT_NE(records()[0].number, records()[1].number);
}

TEST_F(SessionActivity, CountsWhatItCannotWrite) {
    EXPECT_EQ(lostRecords(), 0U);
    begin([] {
        const rlimit none{0, 0};
        velt_session_opened(&anna);
        setrlimit(RLIMIT_FSIZE, &none);
        const velt_record removal{"delete", "done", nullptr, "/a", nullptr, nullptr, -1, -1};
        velt_record_operation(&removal);
        velt_record_operation(&removal);
    });
    EXPECT_EQ(pages().size(), 1U) << "the session was ended";
    EXPECT_EQ(lostRecords(), 2U);
    EXPECT_LT(std::chrono::system_clock::now() -
                  lastLostRecord().value_or(std::chrono::system_clock::time_point()),
              std::chrono::minutes(5));
    EXPECT_EQ(records().size(), 1U);
}

TEST_F(SessionActivity, IsShownAndNotRecordedWhereThatIsSwitchedOff) {
    root_.write("etc/velt/transfers.conf", "version = 1\nrecord = 0\n");
    begin([] {
        velt_session_opened(&anna);
        velt_transfer_began(velt_upload, "/a");
    });
    EXPECT_EQ(pages().size(), 1U);
    end();
    EXPECT_EQ(pages().size(), 0U);
    EXPECT_EQ(files(), 1);
    EXPECT_FALSE(std::filesystem::exists(root_.path() / "var/lib/velt/transfers/spool"));
    EXPECT_EQ(lostRecords(), 0U);
}

TEST_F(SessionActivity, GoesOnWhereNothingCanBeWritten) {
    root_.write("run/velt/sessions", "no folder");
    root_.write("var/lib/velt/transfers", "no folder");
    bool ended = true;
    begin([] {
        velt_session_opened(&anna);
        velt_transfer_began(velt_upload, "/a");
        velt_transfer_moved(1);
        velt_session_closed("logged out");
    });
    ended = waitpid(child_, nullptr, WNOHANG) != 0;
    EXPECT_FALSE(ended);
}

TEST_F(SessionActivity, IsNoneWithoutAFolder) {
    EXPECT_EQ(pages().size(), 0U);
    EXPECT_EQ(lostRecords(), 0U);
}

TEST(SessionName, IsReadStrictly) {
    EXPECT_TRUE(parseSessionName("1z4-8rd2k-0f3a9c21"));
    for (const char* const text :
         {"", "lost", "1-2", "1-2-3", "1-2-0f3a9c2g", "0-2-0f3a9c21", "-2-0f3a9c21", "1--0f3a9c21",
          "zzzzzzzzz-2-0f3a9c21", "1-2-0f3a9c21x", "../1-2-0f3a9c21"}) {
        EXPECT_FALSE(parseSessionName(text)) << text;
    }
}

TEST(PageText, IsUtf8Always) {
    EXPECT_EQ(pageText("a\xfc\u00fc"), "a%FC\u00fc");
    EXPECT_EQ(pageText(std::string_view("ab\0cd", 5)), "ab");
}

} // namespace
} // namespace velt
