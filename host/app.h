// What the host serves: the modules' rows and its own endpoints.
#ifndef VELT_HOST_APP_H
#define VELT_HOST_APP_H

#include "host/access.h"
#include "host/event_hub.h"
#include "host/host_log.h"
#include "host/http/message.h"
#include "host/metrics.h"
#include "host/module_table.h"
#include "host/openapi.h"
#include "host/request_order.h"
#include "host/revision.h"
#include "host/token_store.h"

#include <chrono>
#include <string>

namespace velt::host {

struct AppSettings {
    AccessSettings access;
    std::filesystem::path tokenFile;
    unsigned workers = 4;          ///< threads on which modules run
    std::size_t maxWaiting = 1000; ///< requests that wait for their turn
};

class App final : public HttpHandler {
public:
    /// The table and the log outlive it. Throws TokenError.
    App(const AppSettings& settings, const ModuleTable& table, HostLog& log);

    /// Finishes what runs.
    ~App() override;

    std::optional<Refusal> checkAccess(const HttpRequest& head, const Peer& peer,
                                       Principal& principal) override;
    bool asksForEvents(const HttpRequest& request) const override;
    void handle(HttpRequest request, const Principal& principal, Done done) override;
    HttpResponse failure(int status, const std::string& detail) override;
    void addEventReader(const std::shared_ptr<EventReader>& reader) override;

    /// Finishes the requests that were accepted and accepts no more.
    void stop();

private:
    /// A request on its way.
    struct Job {
        HttpRequest request;
        std::vector<std::string> path; ///< its segments
        Principal principal;
        std::string id;
        Done done;
    };
    using JobPointer = std::shared_ptr<Job>;

    /// One of the host's own endpoints.
    struct Endpoint {
        const char* method;
        std::vector<std::string> path; ///< its segments; "*" stands for any one
        bool adminOnly;
        RequestOrder::Kind kind;
        HttpResponse (App::*answer)(const Job& job);
    };
    static const std::vector<Endpoint>& endpoints();

    void observe();
    void route(const JobPointer& job);
    bool routeToEndpoint(const JobPointer& job);
    void routeToRow(const JobPointer& job);
    void serveRow(const JobPointer& job, const Row& row);
    HttpResponse callAndAnswer(const Job& job, const Row& row, const Json::Value& parameters);
    void logOutcome(const Job& job, const Row& row, const Outcome& outcome, int status);
    void run(const JobPointer& job, RequestOrder::Kind kind, std::function<HttpResponse()> answer);
    void finish(const JobPointer& job, HttpResponse response);
    HttpResponse notAllowed(const Job& job, const std::string& allow);

    HttpResponse listRows(const Job& job);
    HttpResponse health(const Job& job);
    HttpResponse metrics(const Job& job);
    HttpResponse openApi(const Job& job);
    HttpResponse status(const Job& job);
    HttpResponse adminLog(const Job& job);
    HttpResponse listTokens(const Job& job);
    HttpResponse createToken(const Job& job);
    HttpResponse deleteToken(const Job& job);

    const ModuleTable& table_;
    HostLog& log_;
    const std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
    TokenStore tokens_;
    Access access_;
    OpenApi openApi_;
    Metrics metrics_;
    EventHub events_;
    Revision revision_;
    RequestOrder order_; // the last, so that its threads end before what they use
};

} // namespace velt::host

#endif
