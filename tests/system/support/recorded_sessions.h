// Tests of what sessions tell of themselves.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_RECORDED_SESSIONS_H
#define VELT_TESTS_SYSTEM_SUPPORT_RECORDED_SESSIONS_H

#include "standalone/activity/spool_text.h"
#include "standalone/control/open_sessions.h"
#include "tests/support/files.h"
#include "tests/support/result.h"
#include "tests/support/waiting.h"
#include "tests/system/support/shared_folders.h"

#include <filesystem>
#include <functional>
#include <string>
#include <vector>

namespace velt::test {

class RecordedSessions : public SharedFolders {
protected:
    void SetUp() override {
        SharedFolders::SetUp();
        std::error_code ignored;
        std::filesystem::remove_all(spool().parent_path(), ignored);
    }

    static std::filesystem::path spool() { return worldRoot / "var/lib/velt/transfers/spool"; }

    static std::vector<OperationRecord> records() { return parseSpool(contentsOf(spool())).records; }

    /// All records, once there are as many: a client has its answer before the server has written about it.
    static std::vector<OperationRecord> awaitRecords(std::size_t count) {
        EXPECT_TRUE(waitUntil([&] { return records().size() >= count; }, patience));
        return records();
    }

    /// "KIND RESULT PATH OCTETS REASON", a line each, without those of sessions.
    static std::string operations() {
        std::string all;
        for (const OperationRecord& each : records()) {
            if (each.operation == Operation::sessionOpened || each.operation == Operation::sessionClosed) {
                continue;
            }
            all += std::string(operationName(each.operation)) + " " +
                   std::string(operationResultName(each.result)) + " " + each.place.path +
                   (each.newPlace.path.empty() ? "" : " -> " + each.newPlace.path) +
                   (each.octets ? " " + std::to_string(*each.octets) : "") +
                   (each.detail.empty() ? "" : " " + each.detail) +
                   (each.reason.empty() ? "" : " (" + each.reason + ")") + "\n";
        }
        return all;
    }

    static void expectOperations(const std::string& expected) {
        waitUntil([&] { return operations() == expected; }, patience);
        EXPECT_EQ(operations(), expected);
    }

    static std::vector<OpenSession> sessions() {
        auto found = openSessions();
        EXPECT_EQ(messageOf(found), "");
        return found.valueOr({});
    }

    /// The only session, once this holds of it.
    static OpenSession await(const std::function<bool(const OpenSession&)>& holds) {
        OpenSession session;
        EXPECT_TRUE(waitUntil(
            [&] {
                const auto all = sessions();
                session = all.empty() ? OpenSession() : all[0];
                return all.size() == 1 && holds(session);
            },
            patience))
            << session.command << " " << session.octetsIn;
        return session;
    }
};

} // namespace velt::test

#endif
