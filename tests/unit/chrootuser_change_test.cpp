#include "module/entry_functions.h"
#include "tests/support/handler_test.h"

#include <ctime>
#include <ostream>

namespace {

constexpr char alloc[] = "VLIBCSzListAlloc(1024)";
constexpr char freeList[] = "VLIBCSzListFree(list1)";

/// What "add" and "delete" differ in.
struct Method {
    VELT::APIEntryFunction entry;
    std::string operation;
    std::string event;
    std::string failure;
    bool answersWithNames;
};

/// For GoogleTest, which would show its bytes, those between its members among them.
std::ostream& operator<<(std::ostream& stream, const Method& method) {
    return stream << method.operation;
}

const Method addition = {FTPChrootUserAdd, "VELTFTPAddChrootUser", "0x11B00024",
                         "Failed to add chroot users.", true};
const Method deletion = {FTPChrootUserDelete, "VELTFTPDeleteChrootUser", "0x11B00025",
                         "Failed to delete chroot users.", false};

std::string joined(const Lines& names, const std::string& separator) {
    std::string text;
    for (const std::string& name : names) {
        text += (text.empty() ? "\"" : separator + "\"") + name + "\"";
    }
    return "[" + text + "]";
}

std::string push(const std::string& name) {
    return "VLIBCSzListPush(list1 flags=16, \"" + name + "\")";
}

std::string changed(const Method& method, const Lines& names) {
    return method.operation + "(list1 flags=16 " + joined(names, ", ") + ")";
}

Lines entries(const Method& method, const Lines& names) {
    Lines lines;
    for (const std::string& name : names) {
        lines.push_back("VELTLogSet1(1, 1, " + method.event + ", \"" + name + R"(", "", "", ""))");
    }
    return lines;
}

std::string done(const Method& method, const Lines& names) {
    return method.answersWithNames ? succeeded(R"({"chrootuser_id":)" + joined(names, ",") + "}")
                                   : succeeded();
}

/// How a request ends that pushed exactly `names`.
Lines applied(const Method& method, const Lines& names) {
    return Lines{changed(method, names)} + entries(method, names) + Lines{freeList, done(method, names)};
}

Lines begun(const Lines& pushed) {
    Lines lines = {getParams(), alloc};
    for (const std::string& name : pushed) {
        lines.push_back(push(name));
    }
    return lines;
}

class ChrootUserChangeTest : public HandlerTest, public testing::WithParamInterface<Method> {
protected:
    Lines change(const std::string& ids) { return run(GetParam().entry, R"({"id":)" + ids + "}"); }

    /// The processor time, in seconds, of a request with `count` names.
    double secondsToChange(int count) {
        startAfresh();
        // The platform's own work on the names is not what is measured.
        platform.fail(GetParam().operation, 1, 0);
        Lines names;
        for (int i = 0; i < count; ++i) {
            names.push_back("user" + std::to_string(i));
        }
        const std::string params = R"({"id":)" + joined(names, ",") + "}";
        const std::clock_t begin = std::clock();
        run(GetParam().entry, params);
        const std::clock_t end = std::clock();
        EXPECT_EQ(platform.count("VLIBCSzListPush"), count);
        EXPECT_EQ(platform.count("VELTLogSet1"), count);
        EXPECT_LE(platform.count("VLIBCSzListGet"), 2 * count);
        return static_cast<double>(end - begin) / CLOCKS_PER_SEC;
    }
};

std::string nameOf(const testing::TestParamInfo<Method>& info) {
    return info.param.answersWithNames ? "Add" : "Delete";
}

} // namespace

INSTANTIATE_TEST_SUITE_P(BothMethods, ChrootUserChangeTest, testing::Values(addition, deletion), nameOf);

TEST_P(ChrootUserChangeTest, HandsTheNamesToThePlatformAndLogsEach) {
    const Lines names = {"bob", "alice"};
    EXPECT_EQ(change(R"(["bob","alice"])"), begun(names) + applied(GetParam(), names));
}

TEST_P(ChrootUserChangeTest, MovesTheUsersToTheOtherSet) {
    auto& from = GetParam().answersWithNames ? platform.nonChrootUsers : platform.chrootUsers;
    auto& into = GetParam().answersWithNames ? platform.chrootUsers : platform.nonChrootUsers;
    from = {"alice", "bob", "carol"};
    change(R"(["carol","alice"])");
    EXPECT_EQ(from, Lines{"bob"});
    EXPECT_EQ(into, (Lines{"carol", "alice"}));
}

TEST_P(ChrootUserChangeTest, SkipsWhatIsNoTextWithoutAMessage) {
    const Lines names = {"bob", "alice"};
    EXPECT_EQ(change(R"(["bob",7,"alice"])"), begun(names) + applied(GetParam(), names));
    startAfresh();
    EXPECT_EQ(change(R"([null,true,1.5,"bob",[],["carol"],{},{"id":"dave"},-1,"alice"])"),
              begun(names) + applied(GetParam(), names));
}

TEST_P(ChrootUserChangeTest, SucceedsWithoutThePlatformWhenNoElementIsAText) {
    EXPECT_EQ(change("[1,2.5,null]"), begun({}) + Lines({freeList, done(GetParam(), {})}));
}

TEST_P(ChrootUserChangeTest, TakesANameTwice) {
    const Lines names = {"bob", "bob"};
    EXPECT_EQ(change(R"(["bob","bob"])"), begun(names) + applied(GetParam(), names));
}

TEST_P(ChrootUserChangeTest, TakesAnEmptyNameAndNamesOfAnyBytes) {
    const Lines names = {"", "CORP\\\\b\\\"ob", "%s%n", "j\xC3\xBCrgen"};
    EXPECT_EQ(change(joined(names, ",")), begun(names) + applied(GetParam(), names));
}

TEST_P(ChrootUserChangeTest, IgnoresOtherKeys) {
    EXPECT_EQ(run(GetParam().entry, R"({"ID":["carol"],"chroot":7,"id":["bob"]})"),
              begun({"bob"}) + applied(GetParam(), {"bob"}));
}

TEST_P(ChrootUserChangeTest, WantsAnArrayOfNames) {
    for (const char* const params :
         {"{}", "null", R"({"id":null})", R"({"id":[]})", R"({"id":"bob"})", R"({"id":""})", R"({"id":7})",
          R"({"id":true})", R"({"id":{}})", R"({"id":{"0":"bob"}})", R"({"ID":["bob"]})"}) {
        EXPECT_EQ(run(GetParam().entry, params),
                  (Lines{getParams(), logLine("chrootuser", "array variable 'id' is missing or empty.")} +
                   failed("chrootuser", 1901, params)));
    }
}

TEST_P(ChrootUserChangeTest, LetsTheJsonLibrarysErrorPassWhenTheParametersAreNoObject) {
    for (const char* const params : {"[]", R"(["bob"])", "7", "true", R"("id")"}) {
        EXPECT_EQ(runThrowing<Json::LogicError>(GetParam().entry, params), Lines{getParams()}) << params;
    }
}

TEST_P(ChrootUserChangeTest, FailsWithoutAList) {
    platform.fail("VLIBCSzListAlloc");
    EXPECT_EQ(change(R"(["bob"])"),
              (Lines{getParams(), alloc, logLine("chrootuser", "Failed to malloc for list.")} +
               failed("chrootuser", 1902, R"({"id":["bob"]})")));
}

TEST_P(ChrootUserChangeTest, LeavesANameOutThatCannotBePushed) {
    platform.fail("VLIBCSzListPush", 2);
    const Lines kept = {"bob", "carol"};
    EXPECT_EQ(change(R"(["bob","alice","carol"])"),
              (begun({"bob", "alice"}) +
               Lines{logLine("chrootuser", "Failed to VLIBCSzListPush."), push("carol")} +
               applied(GetParam(), kept)));
}

TEST_P(ChrootUserChangeTest, SucceedsWithoutThePlatformWhenEveryPushFails) {
    platform.fail("VLIBCSzListPush", fake::Platform::everyCall);
    const std::string message = logLine("chrootuser", "Failed to VLIBCSzListPush.");
    EXPECT_EQ(change(R"(["bob","alice"])"),
              (begun({"bob"}) + Lines{message, push("alice"), message, freeList, done(GetParam(), {})}));
}

TEST_P(ChrootUserChangeTest, LogsNoUserWhenThePlatformFails) {
    platform.fail(GetParam().operation);
    const Lines names = {"bob", "alice"};
    EXPECT_EQ(change(R"(["bob","alice"])"),
              (begun(names) +
               Lines{changed(GetParam(), names), logLine("chrootuser", GetParam().failure), freeList} +
               failed("chrootuser", 1902, R"({"id":["bob","alice"]})")));
}

TEST_P(ChrootUserChangeTest, TakesAPositiveResultForNoFailure) {
    platform.fail(GetParam().operation, 1, 1);
    platform.fail("VELTLogSet1", 1, 1);
    EXPECT_EQ(change(R"(["bob"])"), begun({"bob"}) + applied(GetParam(), {"bob"}));
}

TEST_P(ChrootUserChangeTest, IgnoresTheFailureOfLogEntries) {
    platform.fail("VELTLogSet1", fake::Platform::everyCall);
    const Lines names = {"bob", "alice"};
    EXPECT_EQ(change(R"(["bob","alice"])"), begun(names) + applied(GetParam(), names));
}

TEST_P(ChrootUserChangeTest, FollowsTheListThatAPushMoves) {
    platform.pushMovesList = true;
    const Lines names = {"bob", "alice", "carol"};
    EXPECT_EQ(change(R"(["bob","alice","carol"])"), begun(names) + applied(GetParam(), names));
}

TEST_P(ChrootUserChangeTest, FreesTheListWhenAnExceptionPasses) {
    const std::string params = R"({"id":["bob"]})";
    platform.throwFrom("VLIBCSzListPush");
    EXPECT_EQ(runThrowing<fake::Thrown>(GetParam().entry, params), begun({"bob"}) + Lines{freeList});
    startAfresh();
    platform.throwFrom(GetParam().operation);
    EXPECT_EQ(runThrowing<fake::Thrown>(GetParam().entry, params),
              begun({"bob"}) + Lines({changed(GetParam(), {"bob"}), freeList}));
    startAfresh();
    platform.throwFrom("VELTLogSet1");
    EXPECT_EQ(runThrowing<fake::Thrown>(GetParam().entry, params),
              begun({"bob"}) + Lines{changed(GetParam(), {"bob"})} + entries(GetParam(), {"bob"}) +
                  Lines{freeList});
}

TEST_P(ChrootUserChangeTest, TakesTimeInProportionToTheNames) {
    const double small = secondsToChange(10000);
    EXPECT_LT(secondsToChange(100000), 40 * small + 0.5); // a quadratic one takes a hundred times as long
}
