#include "host/module/module_call.h"

#include "host/module/api_messages.h"
#include "host/module/module_log.h"

#include <chrono>
#include <exception>

namespace velt::host {

namespace {

/// Runs the entry function; returns what it threw, in words, or "" if it threw nothing.
std::string run(const Row& row, Request& request, Response& response) {
    try {
        row.entry(&request, &response);
        return "";
    } catch (const std::exception& error) {
        return std::string("the entry function threw an exception: ") + error.what();
    } catch (...) {
        return "the entry function threw something other than an exception";
    }
}

void judge(const Response& response, Outcome& outcome) {
    if (!outcome.defect.empty()) {
        return;
    }
    if (response.answers() != 1) {
        outcome.defect =
            "the entry function gave " + std::to_string(response.answers()) + " answers instead of one";
        return;
    }
    outcome.kind = response.success() ? Outcome::Kind::success : Outcome::Kind::refused;
    outcome.code = response.code();
    outcome.data = response.data();
}

} // namespace

Outcome callRow(const Row& row, const Json::Value& parameters, const std::string& actor,
                const std::string& address) {
    Outcome outcome;
    Request request(parameters);
    Response response;
    const ModuleLog log;
    const auto start = std::chrono::steady_clock::now();
    const PlatformRequest platform(actor, address);
    outcome.defect = run(row, request, response);
    outcome.platform = PlatformRequest::report();
    outcome.seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    outcome.logLines = log.lines();
    judge(response, outcome);
    return outcome;
}

} // namespace velt::host
