// Routes each request to the resource that answers it, and runs them in the right order.
#ifndef VELT_HOST_API_APP_H
#define VELT_HOST_API_APP_H

#include "host/api/access_control.h"
#include "host/api/activity_events.h"
#include "host/api/all_settings.h"
#include "host/api/confirmation_watch.h"
#include "host/api/events.h"
#include "host/api/health.h"
#include "host/api/history.h"
#include "host/api/metrics.h"
#include "host/api/openapi.h"
#include "host/api/route.h"
#include "host/api/rows.h"
#include "host/api/token_store.h"
#include "host/api/wrong_tokens.h"
#include "host/base/host_log.h"
#include "host/http/message.h"
#include "host/module/module_table.h"
#include "host/module/request_order.h"

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

namespace velt::host {

struct AppSettings {
    AccessSettings access;
    std::filesystem::path tokenFile;
    unsigned workers = 4;                                        ///< threads on which modules run
    std::size_t maxWaiting = 1000;                               ///< requests of one caller, for their turn
    std::size_t maxWaitingBytes = std::size_t{16} * 1024 * 1024; ///< of their bodies
};

class App final : public HttpHandler {
public:
    /// The table and the log outlive it. Throws TokenError.
    App(const AppSettings& settings, const ModuleTable& table, HostLog& log);
    ~App() override { stop(); }
    App(const App&) = delete;
    App& operator=(const App&) = delete;

    std::optional<Refusal> checkAccess(const HttpRequest& head, const Peer& peer,
                                       Principal& principal) override;
    std::size_t bodyLimit(const HttpRequest& head, const Principal& principal) const override;
    bool asksForEvents(const HttpRequest& request) const override;
    void handle(HttpRequest request, const Principal& principal, Done done) override;
    HttpResponse failure(int status, const std::string& detail) override;
    void addEventReader(const std::shared_ptr<EventReader>& reader, const HttpRequest& request,
                        const Principal& principal) override;

    /// Settles what a former process left of its changes, and takes back those that nobody confirms in time.
    /// Called once, after what was left half-way was undone and before requests come.
    void begin();

    /// Finishes the accepted requests and accepts no more.
    void stop();

private:
    /// A call that is being answered.
    struct Job {
        Call call;
        Done done;
    };
    using JobPointer = std::shared_ptr<Job>;

    /// Whether the request asks for a route of which `holds` is true.
    template<class Condition> bool asksFor(const HttpRequest& request, const Condition& holds) const;

    void addRoutes(const ModuleTable& table);
    void route(const JobPointer& job);
    void submit(const JobPointer& job, const Route& route);
    HttpResponse answer(const Route& route, const Call& call);
    HttpResponse internalError(const std::string& reason, const Call& call);

    HostLog& log_;
    TokenStore tokens_;
    WrongTokens wrongTokens_;
    AccessControl access_;
    OpenApi openApi_;
    Metrics metrics_;
    HealthMonitor health_;
    EventHub events_;
    PlatformEvents platformEvents_;
    ActivityEvents activityEvents_;
    Changes changes_;
    Rows rows_;
    AllSettings settings_;
    History history_;
    std::vector<Route> routes_;
    RequestOrder order_; // behind what its threads use, so that they end first
    std::optional<ConfirmationWatch> confirmations_;
};

} // namespace velt::host

#endif
