// The frame of a handler test: a request, run through an entry function over the fake platform, and the whole
// journal of what it did: platform calls, system log lines and the answer, in order.
#ifndef VELT_TESTS_SUPPORT_HANDLER_TEST_H
#define VELT_TESTS_SUPPORT_HANDLER_TEST_H

#include "platform/webapi.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <gtest/gtest.h>
#include <json/value.h>

#include <string>
#include <vector>

using Lines = std::vector<std::string>;

/// Parses JSON text; a mistake in it fails the test.
Json::Value json(const std::string& text);

/// Both lists of lines, one after the other.
Lines operator+(Lines first, const Lines& second);

/// The journal line of a system log line: `message` is the format after the leading "%s:%d ", `arguments`
/// what fills it, as the journal shows arguments.
std::string logLine(const std::string& source, const std::string& message, const std::string& arguments = "");

/// How every request that takes parameters begins.
std::string getParams();

/// How a request ends that failed with `code`: the answer, and the log of the request's parameters.
Lines failed(const std::string& source, int code, const std::string& params);

/// How a request ends that succeeded with `data` (compact JSON).
std::string succeeded(const std::string& data = "null");

/// Resets the platform before each test; after it, no handle may be left, and everything that was to fail
/// must have been called.
class HandlerTest : public testing::Test {
protected:
    void SetUp() override;
    void TearDown() override;

    /// Ends one round of a test and begins the next: checks what is checked after a test, and leaves the
    /// platform as SetUp() does.
    void startAfresh();

    /// Runs one request and returns the journal of it alone. The answer is checked to be exactly one.
    Lines run(VELT::APIEntryFunction entry, const std::string& params = "{}");

    /// The same with parameters that JSON text cannot express, such as a number's type.
    Lines runWith(VELT::APIEntryFunction entry, const Json::Value& params);

    /// Runs one request whose entry function lets an exception pass, returns the journal, and checks that
    /// there was no answer.
    template<typename Exception>
    Lines runThrowing(VELT::APIEntryFunction entry, const std::string& params = "{}") {
        fake::Request request(json(params));
        fake::Response response;
        platform.journal.clear();
        EXPECT_THROW(entry(&request, &response), Exception);
        EXPECT_TRUE(response.answers.empty());
        return platform.journal;
    }

    /// The answer of the last run().
    const fake::Answer& answer() const { return answer_; }

    fake::Platform& platform = fake::Platform::instance();

private:
    fake::Answer answer_;
};

#endif
