// Any JSON type for any key: the request gets exactly one answer, or the JSON library's own exception where
// the parameters or a rule are no object. Never a crash, never a handle left.

#include "tests/support/full_requests.h"
#include "tests/support/handler_test.h"

#include <json/value.h>

#include <algorithm>
#include <optional>
#include <set>

namespace {

const std::vector<Json::Value>& anyValues() {
    static const std::vector<Json::Value> values = {json("null"),
                                                    json("true"),
                                                    json("false"),
                                                    json("0"),
                                                    json("-1"),
                                                    json("65536"),
                                                    json("2147483647"),
                                                    json("-2147483648"),
                                                    json("4294967295"),
                                                    json("18446744073709551615"),
                                                    json("21.0"),
                                                    json("21.5"),
                                                    json("1e300"),
                                                    json(R"("")"),
                                                    json(R"("text")"),
                                                    json(R"("1:2")"),
                                                    json("\"nul\\u0000byte\""),
                                                    json("[]"),
                                                    json("[1]"),
                                                    json("{}"),
                                                    json(R"({"a":1})")};
    return values;
}

class JsonTypes : public HandlerTest, public testing::WithParamInterface<FullRequest> {
protected:
    /// Whether the request with these parameters was answered; otherwise the JSON library threw.
    bool answers(const Json::Value& params) {
        startAfresh();
        GetParam().prepare(platform);
        fake::Request request(params);
        fake::Response response;
        bool threw = false;
        try {
            GetParam().entry(&request, &response);
        } catch (const Json::Exception&) {
            threw = true;
        }
        EXPECT_EQ(response.answers.size(), threw ? 0U : 1U);
        EXPECT_EQ(platform.handleErrors(), Lines{});
        return !threw;
    }
};

// A set of rules that is an object with members cannot be indexed by number, and an array whose elements are
// no objects has no keys.
bool mayThrow(const std::string& key, const Json::Value& value) {
    return key == "rules" && ((value.isObject() && !value.empty()) || (value.isArray() && !value.empty()));
}

TEST_P(JsonTypes, OfAnyKeyGetOneAnswer) {
    const Json::Value params = json(GetParam().params);
    for (const std::string& key : params.getMemberNames()) {
        for (const Json::Value& value : anyValues()) {
            SCOPED_TRACE(key + " = " + value.toStyledString());
            Json::Value changed = params;
            changed[key] = value;
            EXPECT_EQ(answers(changed), !mayThrow(key, value));
        }
    }
}

TEST_P(JsonTypes, OfTheParametersAsAWholeGetOneAnswerOrTheLibrarysException) {
    const bool readsParameters = !json(GetParam().params).empty();
    for (const Json::Value& value : anyValues()) {
        SCOPED_TRACE(value.toStyledString());
        EXPECT_EQ(answers(value), !readsParameters || value.isNull() || value.isObject());
    }
}

INSTANTIATE_TEST_SUITE_P(Rows, JsonTypes, testing::ValuesIn(fullRequests()), testNameOf);

} // namespace
