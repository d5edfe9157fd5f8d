#include "cli/api_client.h"

#include "cli/json_io.h"
#include "cli/server_refusal.h"

#include <chrono>
#include <thread>

namespace velt::cli {

namespace {

constexpr long preconditionFailed = 412;
constexpr int mostAttempts = 20;

/// Something was changed since it was read.
struct Outdated {};

std::string pathOf(const ApiMethod& method) {
    return "/api/" + percentEncode(method.api) + "/v" + std::to_string(method.version) + "/" +
           percentEncode(method.method);
}

/// The path in "</api/transfers?before=1-2>; rel=\"next\""; "" for another text.
std::string nextIn(const std::string& link) {
    const auto end = link.find('>');
    const bool isNext = link.starts_with('<') && end != std::string::npos &&
                        link.find("rel=\"next\"", end) != std::string::npos;
    return isNext ? link.substr(1, end - 1) : "";
}

} // namespace

Json::Value ApiClient::exchange(const std::string& method, const std::string& path,
                                const std::optional<std::string>& body) {
    const bool conditional = watching_ && body;
    const HttpAnswer answer = http_.send(method, path, body, conditional ? seen_ : "");
    if (conditional && answer.status == preconditionFailed) {
        throw Outdated();
    }
    if (watching_ && (conditional || seen_.empty())) {
        seen_ = answer.etag;
    }
    if (answer.status == 204) {
        return {};
    }
    if (answer.status != 200 && answer.status != 201) {
        throw failureFrom(answer, server(), {method, path});
    }
    const auto value = parseJson(answer.body);
    if (!value) {
        throw Failure(ExitCode::access, "The answer from " + server().name() + " is not JSON.", checkAddress);
    }
    return *value;
}

Json::Value ApiClient::read(const ApiMethod& method) {
    return get(pathOf(method));
}

Json::Value ApiClient::call(const ApiMethod& method, const Json::Value& parameters,
                            const std::string& query) {
    return post(pathOf(method) + query, parameters);
}

void ApiClient::changeWhatWasRead(const std::function<void()>& change) {
    for (int attempt = 1; attempt <= mostAttempts; ++attempt) {
        watching_ = true;
        seen_.clear();
        try {
            change();
            watching_ = false;
            return;
        } catch (const Outdated&) {
            std::this_thread::sleep_for(std::chrono::milliseconds(10 * attempt));
        } catch (...) {
            watching_ = false;
            throw;
        }
    }
    watching_ = false;
    throw Failure(ExitCode::conflict, "Others keep changing the settings at the same time.",
                  "Try again later.", {"Nothing was changed."});
}

Json::Value ApiClient::get(const std::string& path) {
    return exchange("GET", path, std::nullopt);
}

TextPage ApiClient::getText(const std::string& path) {
    HttpAnswer answer = http_.send("GET", path, std::nullopt);
    if (answer.status != 200) {
        throw failureFrom(answer, server(), {"GET", path});
    }
    return {std::move(answer.body), nextIn(answer.link)};
}

Json::Value ApiClient::post(const std::string& path, const Json::Value& body) {
    return exchange("POST", path, compactJson(body));
}

Json::Value ApiClient::patch(const std::string& path, const Json::Value& body) {
    return exchange("PATCH", path, compactJson(body));
}

Json::Value ApiClient::remove(const std::string& path) {
    return exchange("DELETE", path, std::nullopt);
}

void ApiClient::follow(const std::string& path, const std::function<bool(std::string_view)>& onText,
                       const std::function<bool()>& stop) {
    const HttpAnswer answer = http_.follow(path, onText, stop);
    // The status is 0 when this was stopped before the server answered.
    if (answer.status != 200 && answer.status != 0) {
        throw failureFrom(answer, server(), {"GET", path});
    }
}

} // namespace velt::cli
