// Each platform call of a full request is made to fail, and to throw, in turn. Whatever fails: one answer,
// nothing called after the failure that decides it, no handle left.

#include "tests/support/full_requests.h"
#include "tests/support/handler_test.h"

#include <algorithm>
#include <climits>
#include <map>
#include <set>

namespace {

// A failure of these is passed over: the request goes on as if nothing had happened, or with a default.
const std::set<std::string> tolerated = {"VELTFTPASCIIEnabledGet",
                                         "VELTFTPChrootRuleFormat",
                                         "VELTFTPChrootRuleParseToName",
                                         "VELTFTPDefaultPassivePortGet",
                                         "VELTFTPTimeOutGet",
                                         "VELTFTPUmaskEnabledGet",
                                         "VELTFTPUseUTF8Get",
                                         "VELTFwRuleHup",
                                         "VELTGroupGet",
                                         "VELTLogSet1",
                                         "VELTSFTPIsAlive",
                                         "VELTUserGet",
                                         "VLIBCSzHashAlloc",
                                         "VLIBCSzHashSetValue",
                                         "VLIBCSzListPush",
                                         "VLIBServiceIsEnabled",
                                         "VLIBSyseventEmit",
                                         "SDK::User::GetDesc",
                                         "SDK::User::LoadUser"};

// These cannot fail: they release.
const std::set<std::string> infallible = {"VLIBCSzListFree", "VLIBCSzHashFree", "VELTShareFree",
                                          "SDK::User::Release"};

// Any negative result is a failure, not just the one that is commonly returned.
constexpr int failures[] = {-1, INT_MIN};

struct Call {
    std::string operation;
    int nth; ///< of this operation
};

std::string describe(const Call& call, int result) {
    return call.operation + " #" + std::to_string(call.nth) + " returns " + std::to_string(result);
}

bool isOfThePlatform(const std::string& operation) {
    return operation != "syslog" && !operation.starts_with("APIRe") && !infallible.contains(operation);
}

class FaultSweep : public HandlerTest, public testing::WithParamInterface<FullRequest> {
protected:
    void prepare() {
        startAfresh();
        GetParam().prepare(platform);
    }

    /// The journal of the request when the call returns `result`.
    Lines runFailing(const Call& call, int result) {
        prepare();
        platform.fail(call.operation, call.nth, result);
        return run(GetParam().entry, GetParam().params);
    }

    /// What the request calls when nothing fails.
    std::vector<Call> calls() {
        prepare();
        std::vector<Call> found;
        std::map<std::string, int> seen;
        for (const std::string& line : run(GetParam().entry, GetParam().params)) {
            const std::string operation = fake::Platform::operationOf(line);
            const int nth = ++seen[operation];
            if (isOfThePlatform(operation)) {
                found.push_back({operation, nth});
            }
        }
        EXPECT_TRUE(answer().success);
        return found;
    }

    bool isTolerated(const std::string& operation) const {
        const std::string name = GetParam().name;
        // A rule's share that cannot be found means that its directory does not exist; the reading of
        // settings needs the FIPS switch, the applying takes a failure as on.
        return tolerated.contains(operation) ||
               (operation == "VELTShareGet" && name == "FTPChrootUserLoad") ||
               (operation == "VELTFTPFIPSEnabledGet" && name.starts_with("FTPSet"));
    }
};

/// What a port conflict and an unreachable share are answered with; everything else with 1902.
int expectedCode(const std::string& request, const Call& call) {
    if (call.operation == "WebUtils::IsPortConflict") {
        if (request.starts_with("SFTP")) {
            return 1951;
        }
        return call.nth == 1 ? 1903 : 1904;
    }
    return call.operation == "VELTShareGet" || call.operation == "VELTShareUGPrivGetLocal" ? 1905 : 1902;
}

TEST_P(FaultSweep, EachCallThatFailsIsAnsweredOnceAndLeavesNoHandle) {
    for (const Call& call : calls()) {
        for (const int result : failures) {
            SCOPED_TRACE(describe(call, result));
            runFailing(call, result);
            EXPECT_EQ(platform.handleErrors(), Lines{});
            EXPECT_EQ(platform.unmetScripts(), Lines{});
            EXPECT_EQ(answer().success, isTolerated(call.operation));
            if (!answer().success) {
                EXPECT_EQ(answer().code, expectedCode(GetParam().name, call));
            }
        }
    }
}

TEST_P(FaultSweep, EachNegativeResultIsTheSameFailure) {
    for (const Call& call : calls()) {
        if (call.operation == "VELTFTPTimeOutGet") {
            continue; // any result is a time-out
        }
        const Lines expected = runFailing(call, failures[0]);
        EXPECT_EQ(runFailing(call, failures[1]), expected) << describe(call, failures[1]);
    }
}

TEST_P(FaultSweep, NothingIsCalledAfterTheFailureThatDecides) {
    for (const Call& call : calls()) {
        if (isTolerated(call.operation)) {
            continue;
        }
        for (const int result : failures) {
            SCOPED_TRACE(describe(call, result));
            const Lines journal = runFailing(call, result);
            int seen = 0;
            const auto failing = std::find_if(journal.begin(), journal.end(), [&](const std::string& line) {
                return fake::Platform::operationOf(line) == call.operation && ++seen == call.nth;
            });
            ASSERT_NE(failing, journal.end());
            EXPECT_TRUE(std::none_of(failing + 1, journal.end(), [](const std::string& line) {
                return isOfThePlatform(fake::Platform::operationOf(line));
            }));
        }
    }
}

TEST_P(FaultSweep, EachCallThatThrowsReachesTheFrameworkWithoutAnAnswer) {
    for (const Call& call : calls()) {
        SCOPED_TRACE(call.operation + " #" + std::to_string(call.nth));
        prepare();
        platform.throwFrom(call.operation, call.nth);
        runThrowing<fake::Thrown>(GetParam().entry, GetParam().params);
        EXPECT_EQ(platform.handleErrors(), Lines{});
    }
}

TEST_P(FaultSweep, ListsAndMapsThatMoveChangeNothing) {
    prepare();
    const Lines still = run(GetParam().entry, GetParam().params);
    prepare();
    platform.enumeratorsReplaceList = true;
    platform.pushMovesList = true;
    platform.hashMoves = true;
    EXPECT_EQ(run(GetParam().entry, GetParam().params), still);
}

INSTANTIATE_TEST_SUITE_P(Rows, FaultSweep, testing::ValuesIn(fullRequests()), testNameOf);

} // namespace
