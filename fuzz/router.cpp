// Requests of an administrator that get as far as the module, over the fake platform. The input is
// "METHOD TARGET", a line end, and the body.
#include "base/sha256.h"
#include "fuzz/target.h"
#include "host/api/app.h"
#include "tests/host/fake_standalone.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/temporary_folder.h"

#include <json/reader.h>

#include <future>

namespace {

using velt::host::HttpRequest;
using velt::host::HttpResponse;

struct Host {
    velt::test::TemporaryFolder folder;
    velt::host::ModuleTable table;
    velt::host::HostLog log{[](const std::string&) {}};
    std::unique_ptr<velt::host::App> app;

    Host() {
        // OpenSSL has to be there before, or it would end before the threads for which it keeps something.
        static_cast<void>(velt::sha256(""));
        table.load(MODULE_PATH);
        velt::host::AppSettings settings;
        settings.tokenFile = folder.path() / "tokens.json";
        settings.workers = 1; // the fake platform knows one thread
        app = std::make_unique<velt::host::App>(settings, table, log);
    }
};

HttpRequest requestOf(const std::string& input) {
    const auto lineEnd = std::min(input.find('\n'), input.size());
    const std::string line = input.substr(0, lineEnd);
    const auto blank = std::min(line.find(' '), line.size());
    HttpRequest request;
    request.method = line.substr(0, blank);
    request.target = blank < line.size() ? line.substr(blank + 1) : "/";
    request.body = lineEnd < input.size() ? input.substr(lineEnd + 1) : "";
    return request;
}

HttpResponse answerOf(velt::host::App& app, const HttpRequest& request) {
    std::promise<HttpResponse> answered;
    velt::host::Principal principal;
    principal.role = velt::host::Role::admin;
    app.handle(request, principal,
               [&answered](HttpResponse response) { answered.set_value(std::move(response)); });
    return answered.get_future().get();
}

bool holdsWhatItSays(const HttpResponse& response) {
    if (response.contentType.find("json") == std::string::npos) {
        return true;
    }
    Json::Value value;
    const char* const begin = response.body.data();
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    return reader->parse(begin, begin + response.body.size(), &value, nullptr);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static Host host;
    fake::Platform::instance().reset();
    FakeStandalone::instance().reset();
    const HttpRequest request = requestOf(velt::fuzz::textOf(data, size));
    if (host.app->asksForEvents(request)) {
        return 0;
    }
    const HttpResponse response = answerOf(*host.app, request);
    velt::fuzz::check(response.status >= 200 && response.status < 600, "the answer has a status");
    velt::fuzz::check(holdsWhatItSays(response), "an answer of JSON can be read");
    velt::fuzz::check(fake::Platform::instance().handleErrors().empty(), "the module frees what it makes");
    return 0;
}
