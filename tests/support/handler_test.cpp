#include "tests/support/handler_test.h"

#include <json/reader.h>
#include <json/writer.h>

#include <memory>
#include <stdexcept>

namespace {

std::string quoted(const std::string& text) {
    return Json::valueToQuotedString(text.c_str());
}

} // namespace

Json::Value json(const std::string& text) {
    Json::Value value;
    std::string errors;
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    if (!reader->parse(text.data(), text.data() + text.size(), &value, &errors)) {
        throw std::invalid_argument("no JSON: " + text + ": " + errors);
    }
    return value;
}

Lines operator+(Lines first, const Lines& second) {
    first.insert(first.end(), second.begin(), second.end());
    return first;
}

std::string logLine(const std::string& source, const std::string& message, const std::string& arguments) {
    return "syslog(3, " + quoted("%s:%d " + message) + ", " + quoted(source) +
           (arguments.empty() ? "" : ", " + arguments) + ")";
}

std::string getParams() {
    return R"(APIRequest::GetParam("", null))";
}

Lines failed(const std::string& source, int code, const std::string& params) {
    Json::StreamWriterBuilder compact;
    compact["indentation"] = "";
    const std::string text = Json::writeString(compact, json(params)) + "\n";
    return {"APIResponse::SetError(" + std::to_string(code) + ", null)", getParams(),
            logLine(source, "Request: %s", quoted(text))};
}

std::string succeeded(const std::string& data) {
    return "APIResponse::SetSuccess(" + data + ")";
}

void HandlerTest::SetUp() {
    platform.reset();
}

void HandlerTest::TearDown() {
    EXPECT_EQ(platform.handleErrors(), Lines{});
    EXPECT_EQ(platform.unmetScripts(), Lines{});
    for (const fake::LogLine& line : platform.logLines) {
        EXPECT_GT(line.line, 0) << line.rendered;
    }
}

void HandlerTest::startAfresh() {
    SCOPED_TRACE("at the end of the round before");
    TearDown();
    SetUp();
}

Lines HandlerTest::run(VELT::APIEntryFunction entry, const std::string& params) {
    return runWith(entry, json(params));
}

Lines HandlerTest::runWith(VELT::APIEntryFunction entry, const Json::Value& params) {
    fake::Request request(params);
    fake::Response response;
    platform.journal.clear();
    entry(&request, &response);
    EXPECT_EQ(response.answers.size(), 1U) << "a request is answered exactly once";
    answer_ = response.answers.empty() ? fake::Answer{} : response.answers.front();
    return platform.journal;
}
